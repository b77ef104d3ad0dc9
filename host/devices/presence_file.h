// Who was seen when: /run/vorn/devices.seen, replaced whole by the scanner and read by everyone else.
//
// It lies in memory, so that what changes every few seconds wears no flash. Times are those of CLOCK_BOOTTIME: a clock
// that is set while devices come and go makes nobody come or go.
#ifndef HOST_DEVICES_PRESENCE_FILE_H
#define HOST_DEVICES_PRESENCE_FILE_H

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>

namespace vornhost {

constexpr char kPresenceFile[] = "/run/vorn/devices.seen"; // mode 0600

/// Milliseconds since the machine started, sleep included.
int64_t BootMillis();

struct RadioFigures {
  int64_t signal = 0;   ///< as the wireless daemon gives it
  int64_t received = 0; ///< bytes
  int64_t sent = 0;     ///< bytes

  bool operator==(const RadioFigures &) const = default;
};

struct Presence {
  int64_t seen = 0;                  ///< BootMillis of the last evidence
  std::optional<RadioFigures> radio; ///< of a station that is associated

  bool operator==(const Presence &) const = default;
};

/// By MAC address.
using PresenceMap = std::unordered_map<std::string, Presence>;

/// A line that is none is passed over.
PresenceMap ParsePresence(std::string_view content);
std::string RenderPresence(const PresenceMap &presence);

/// @return false when it could not be written; the old one is there then
bool WritePresence(const PresenceMap &presence);

} // namespace vornhost

#endif
