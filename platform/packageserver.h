// Client of the package server, which recommends add-on packages.
#ifndef PLATFORM_PACKAGESERVER_H
#define PLATFORM_PACKAGESERVER_H

#include <json/value.h>

namespace VORNPackageServer {

/// Asks the package server for its list of recommended packages. Waits for the server, within a time limit; safe from
/// several threads.
/// @param[in]  language  a language code, such as "enu"
/// @param[in]  page      the name of the server's page
/// @param[out] result    what the server answered, a JSON value
/// @retval non-zero  done
/// @retval 0         no server is configured, it cannot be reached or trusted, or it did not answer with JSON; `result`
/// is
///                   left as it was
int PMSGetRecommendPkgList(const char *language, const char *page, Json::Value &result);

} // namespace VORNPackageServer

#endif
