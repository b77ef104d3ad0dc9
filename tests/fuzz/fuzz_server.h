// The server's inside with a state of its own: what the targets that speak HTTP talk to.
#ifndef TESTS_FUZZ_FUZZ_SERVER_H
#define TESTS_FUZZ_FUZZ_SERVER_H

#include "webapi/service.h"
#include "webapi/session.h"

#include <string>
#include <string_view>

namespace vornfuzz {

/// A program's token; a reading one is the same with 'e' and '5' changed about.
inline constexpr std::string_view kToken = "5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e";
inline constexpr std::string_view kReadingToken = "e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5e5";

/// Rows: A version 1 get and set answer their parameters, version 2 get throws.
vornwebapi::Service &TheService();

/// Puts tokens and session back in place: no input sees what another one did.
void Renew();
const std::string &SessionId();
const std::string &SessionCsrf();

/// The live session's secrets in the place of "{ID}" and "{CSRF}": no corpus can know them.
std::string Fill(std::string text);

/// What was answered on one connection.
struct Talk {
  std::string statuses; ///< each with a blank behind it, in order
  bool closed = false;
};

/// @param[in] firstPiece  bytes that come at once; each further piece is three times as long
Talk Converse(std::string_view bytes, size_t firstPiece, bool secure = false);

} // namespace vornfuzz

#endif
