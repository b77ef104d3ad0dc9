// The framework's lines in the system log.
#ifndef WEBAPI_LOG_H
#define WEBAPI_LOG_H

#include "webapi/export.h"

#include <cstddef>
#include <string>
#include <string_view>

namespace vornwebapi {

/// What a line speaks of. Each kind has its priority and its own allowance of lines, so that a flood of one cannot
/// drown another or fill the disk: 10 lines in 10 seconds, then how many were left out.
enum class LogKind {
  kLifecycle,       ///< start, stop; never held back
  kModuleFault,     ///< the module threw or answered nothing
  kConnectionLimit, ///< connections in all or from one address
  kDescriptorLimit, ///< the process or the system has no descriptors left
  kSlowClient,      ///< a deadline was reached
  kRefusedRequest,  ///< too long, too deep, malformed
  kBusy,            ///< every waiting place taken
  kTaskLimit,       ///< a poll task was refused
  kLogin,           ///< someone logged in
  kRefusedLogin,    ///< with a wrong user or password
  kLoginLimit,      ///< too many tries
  kChange,          ///< a call that may change something: who, from where, what, and what came of it
  kCount
};

/// @param[in] toStandardError  true: lines go to the standard error stream too
VORN_WEBAPI_EXPORT void OpenLog(bool toStandardError);

VORN_WEBAPI_EXPORT void Log(LogKind kind, const char *format, ...) __attribute__((format(printf, 2, 3)));

/// A text from outside as it may stand in a line: bytes other than printable ASCII as \xNN, the rest after the first
/// `longest` bytes left out.
VORN_WEBAPI_EXPORT std::string Printable(std::string_view text, size_t longest = 100);

} // namespace vornwebapi

#endif
