// Loading a module and checking its table.
#ifndef WEBAPI_MODULE_H
#define WEBAPI_MODULE_H

#include "webapi/export.h"

#include "platform/webapi.h"

#include <string>
#include <vector>

namespace vornwebapi {

/// Opens a module, for as long as the process lives, and checks its whole table.
/// @param[out] rows   the rows; they point into the module
/// @param[out] fault  one line that names the fault, with the row's number from 1 and what it says
/// @return false when the module is not to be served
bool LoadModule(const std::string &path, std::vector<VORN::APIEntry> &rows, std::string &fault);

/// Where a row is reached.
std::string PathOf(const VORN::APIEntry &row);

/// The check alone. A table without an end row within 4096 rows is refused.
bool CheckTable(const VORN::APIEntry *table, std::vector<VORN::APIEntry> &rows, std::string &fault);

} // namespace vornwebapi

#endif
