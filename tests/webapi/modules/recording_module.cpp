// Another module's rows with a handler that tells that it was entered: a line in the file that the environment names.
#include "platform/webapi.h"

#include <dlfcn.h>

#include <cstdlib>
#include <fstream>
#include <vector>

namespace {

void Enter(VORN::APIRequest *request, VORN::APIResponse *response) {
  const char *file = std::getenv("VORN_TEST_ENTERED");
  std::ofstream(file != nullptr ? file : "/dev/null", std::ios::app) << "in\n";
  if (request->HasParam("fail")) {
    response->SetError(4300, Json::Value());
  } else {
    response->SetSuccess(Json::Value());
  }
}

std::vector<VORN::APIEntry> MakeRows() {
  std::vector<VORN::APIEntry> rows;
  void *module = dlopen(RECORDED_MODULE, RTLD_NOW | RTLD_LOCAL);
  const auto getTable =
      module == nullptr ? nullptr : reinterpret_cast<VORN::APIEntry *(*)()>(dlsym(module, "GetAPITable"));
  const VORN::APIEntry *row = getTable == nullptr ? nullptr : getTable();
  for (; row != nullptr && row->api != nullptr; ++row) {
    rows.push_back({row->api, row->version, row->method, Enter});
  }
  rows.push_back({nullptr, 0, nullptr, nullptr});
  return rows;
}

} // namespace

extern "C" __attribute__((visibility("default"))) VORN::APIEntry *GetAPITable() {
  static std::vector<VORN::APIEntry> rows = MakeRows();
  return rows.data();
}
