// Modules that are not to be served. FAULT, the number of its name in CMakeLists.txt, chooses which.
#include "platform/webapi.h"

#include <cstdio>
#include <stdexcept>

#define TEST_EXPORT __attribute__((visibility("default")))

namespace {

[[maybe_unused]] void Handler(VORN::APIRequest * /*request*/, VORN::APIResponse *response) {
  response->SetSuccess(Json::Value());
}

#if FAULT == 8 // kEndless
struct Endless {
  char names[5000][16];
  VORN::APIEntry rows[5000];
  Endless() {
    for (int index = 0; index < 5000; ++index) {
      std::snprintf(names[index], sizeof names[index], "Row.%d", index);
      rows[index] = {names[index], 1, "get", Handler};
    }
  }
};
Endless endless;
#endif

[[maybe_unused]] VORN::APIEntry rows[] = {
#if FAULT == 3
    {"VORN.Bad", 1, "get", Handler},
    {"VORN.Bad", 1, "set", nullptr},
#elif FAULT == 4
    {"VORN.Bad", 1, "get", Handler},
    {nullptr, 1, "set", Handler},
#elif FAULT == 5
    {"VORN.Bad", 1, nullptr, Handler},
#elif FAULT == 6
    {"VORN.Bad", 0, "get", Handler},
#elif FAULT == 7
    {"VORN.Bad", 1, "get", Handler},
    {"VORN.Other", 1, "get", Handler},
    {"VORN.Bad", 1, "get", Handler},
#elif FAULT == 9
    {"VORN/Bad", 1, "get", Handler},
#endif
    {nullptr, 0, nullptr, nullptr}};

} // namespace

#if FAULT != 0
extern "C" TEST_EXPORT VORN::APIEntry *GetAPITable() {
#if FAULT == 1
  return nullptr;
#elif FAULT == 8
  return endless.rows;
#elif FAULT == 10
  throw std::runtime_error("no table today");
#else
  return rows;
#endif
}
#endif
