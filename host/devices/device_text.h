// Texts that come from devices, made fit to be kept and shown.
#ifndef HOST_DEVICES_DEVICE_TEXT_H
#define HOST_DEVICES_DEVICE_TEXT_H

#include <string>
#include <string_view>

namespace vornhost {

/// No name, type or model is longer, in bytes.
constexpr size_t kTextLimit = 255;

/// Whether a text is UTF-8 (RFC 3629) without control characters and of at most kTextLimit bytes.
bool IsCleanText(std::string_view text);

/// What can be kept of a foreign text: bytes that are no UTF-8 and control characters (C0, DEL, C1) are left out,
/// blanks at both ends too, and what is longer than kTextLimit is cut between two characters. Markup is a text like any
/// other: who shows it escapes it.
std::string CleanText(std::string_view text);

/// A name as CleanText gives it, without the domain that the home itself adds (".local", ".lan", a final dot).
/// @return empty for what is no name: "?", "*", "<unknown>", "(none)", "unknown", "localhost", "wpad"
std::string CleanName(std::string_view text);

} // namespace vornhost

#endif
