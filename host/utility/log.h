// The system log, as the platform library writes it.
#ifndef HOST_UTILITY_LOG_H
#define HOST_UTILITY_LOG_H

#include <string>
#include <string_view>

namespace vornhost {

/// One line of level LOG_ERR. What comes from outside goes in as LogText(...), never into the format.
void LogError(const char *format, ...) __attribute__((format(printf, 1, 2)));

/// One line of level LOG_WARNING: something was wrong, and the platform helped itself.
void LogWarning(const char *format, ...) __attribute__((format(printf, 1, 2)));

/// One line of level LOG_INFO.
void LogInfo(const char *format, ...) __attribute__((format(printf, 1, 2)));

/// A foreign text made fit for one line of the log: control characters and bytes that are not ASCII become '?', and
/// what is longer than `limit` bytes is cut.
std::string LogText(std::string_view text, size_t limit = 200);

} // namespace vornhost

#endif
