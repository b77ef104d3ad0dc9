#include "webapi/module.h"

#include "webapi/text.h"

#include <dlfcn.h>

#include <algorithm>
#include <exception>
#include <set>
#include <tuple>

namespace vornwebapi {
namespace {

constexpr size_t kMostRows = 4096;
constexpr size_t kLongestName = 200;

using GetTable = VORN::APIEntry *(*)();

bool IsEnd(const VORN::APIEntry &row) {
  return row.api == nullptr && row.version == 0 && row.method == nullptr && row.handler == nullptr;
}

std::string Describe(size_t number, const VORN::APIEntry &row) {
  const auto name = [](const char *text) { return text == nullptr ? std::string("(null)") : std::string(text); };
  return "row " + std::to_string(number) + " (" + name(row.api) + ", version " + std::to_string(row.version) + ", " +
         name(row.method) + ")";
}

/// Names stand in paths as they are, so that no two ways of writing one exist.
bool IsName(const char *text) {
  const std::string_view name = text;
  return !name.empty() && name.size() <= kLongestName && std::all_of(name.begin(), name.end(), [](char c) {
    return IsAlphanumeric(c) || c == '.' || c == '_' || c == '-';
  });
}

const char *FaultOf(const VORN::APIEntry &row) {
  if (row.api == nullptr) {
    return "has no API name";
  }
  if (row.method == nullptr) {
    return "has no method name";
  }
  if (row.handler == nullptr) {
    return "has no handler";
  }
  if (row.version < 1) {
    return "has a version below 1";
  }
  if (!IsName(row.api) || !IsName(row.method)) {
    return "has a name with other characters than letters, digits, '.', '_' and '-'";
  }
  return nullptr;
}

} // namespace

std::string PathOf(const VORN::APIEntry &row) {
  return std::string("/webapi/") + row.api + '/' + std::to_string(row.version) + '/' + row.method;
}

bool CheckTable(const VORN::APIEntry *table, std::vector<VORN::APIEntry> &rows, std::string &fault) {
  if (table == nullptr) {
    fault = "GetAPITable returned no table";
    return false;
  }
  std::set<std::tuple<std::string_view, int32_t, std::string_view>> seen;
  rows.clear();
  for (const VORN::APIEntry *row = table; !IsEnd(*row); ++row) {
    const size_t number = rows.size() + 1;
    const char *wrong = number > kMostRows ? "is one too many: the table has no end" : FaultOf(*row);
    if (wrong == nullptr && !seen.emplace(row->api, row->version, row->method).second) {
      wrong = "stands twice";
    }
    if (wrong != nullptr) {
      fault = (number > kMostRows ? "row " + std::to_string(number) : Describe(number, *row)) + " " + wrong;
      return false;
    }
    rows.push_back(*row);
  }
  if (rows.empty()) {
    fault = "the table is empty";
  }
  return !rows.empty();
}

bool LoadModule(const std::string &path, std::vector<VORN::APIEntry> &rows, std::string &fault) {
  try { // what a constructor of the library's own throws ends the process: the dynamic linker lets nothing through
    void *library = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (library == nullptr) {
      fault = dlerror();
      return false;
    }
    const auto getTable = reinterpret_cast<GetTable>(dlsym(library, "GetAPITable"));
    if (getTable == nullptr) {
      fault = path + ": no GetAPITable in it";
      return false;
    }
    if (!CheckTable(getTable(), rows, fault)) {
      fault = path + ": " + fault;
      return false;
    }
  } catch (const std::exception &error) {
    fault = path + ": threw while it was loaded: " + error.what();
    return false;
  } catch (...) {
    fault = path + ": threw while it was loaded";
    return false;
  }
  return true;
}

} // namespace vornwebapi
