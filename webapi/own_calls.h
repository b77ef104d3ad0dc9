// The server's own calls: login and what belongs to it.
#ifndef WEBAPI_OWN_CALLS_H
#define WEBAPI_OWN_CALLS_H

#include "webapi/access.h"

#include <json/value.h>

namespace vornwebapi {

/// @param[in] caller  none for a login only
/// @param[in] head    for a login: the cookie that it brings is ended
Answer RunOwnCall(OwnCall call, Access &access, const Caller *caller, const Peer &peer, const RequestHead &head,
                  const Json::Value &parameters);

} // namespace vornwebapi

#endif
