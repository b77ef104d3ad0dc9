// The OpenAPI document: made from the loaded table and what the module's authors say of each row.
#ifndef WEBAPI_API_DOCUMENT_H
#define WEBAPI_API_DOCUMENT_H

#include "webapi/export.h"

#include "platform/webapi.h"

#include <string>
#include <vector>

namespace vornwebapi {

/// @param[in]  rows         all of them become operations, described or not; so do the server's own calls
/// @param[in]  description  JSON: "title", "version", "schemas" and "rows", whose members are named
/// "API/version/method"
///                          and have "summary", "parameters" (a schema), "data" (the answer's schema) and "errors"
///                          (code to meaning). Empty: nothing is said of any row
/// @param[in]  secure       TLS is spoken: the session's cookie has another name then
/// @param[out] faults       one line each: a row that is not or not wholly described, a description of no row
/// @return the document, OpenAPI 3.1
std::string MakeApiDocument(const std::vector<VORN::APIEntry> &rows, const std::string &description, bool secure,
                            std::vector<std::string> &faults);

/// The whole of a description file, for MakeApiDocument.
/// @return false when it cannot be read
bool ReadDescription(const std::string &path, std::string &description);

} // namespace vornwebapi

#endif
