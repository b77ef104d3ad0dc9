// The stations of one network, as hostapd lists them.
#ifndef HOST_WIRELESS_STATIONS_H
#define HOST_WIRELESS_STATIONS_H

#include "host/wireless/control_socket.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace vornhost {

/// hostapd takes so many stations at most (its MAX_STA_COUNT). A list costs one request more than there are stations,
/// and three times that when stations leave while it is walked.
constexpr size_t kStationLimit = 2007;

/// What hostapd knows of one. The driver counts the traffic and measures the signal; without a driver there are none.
struct Station {
  std::string mac; ///< lower case, colons
  /// Let into the network. hostapd also lists a station that was just thrown out, and one that does not know the key.
  bool authorized = false;
  std::optional<int> signal; ///< of the last frame that came from it, in dBm
  /// Bytes since it associated, counted by the access point: received from it, and sent to it.
  std::optional<uint64_t> received;
  std::optional<uint64_t> sent;
};

/// @param[in] answer  hostapd's answer to STA-FIRST, STA-NEXT or STA
/// @return nothing when it is not a whole one
std::optional<Station> ParseStation(const std::string &answer);

/// Every station that hostapd knows in the network.
/// @return nothing when hostapd does not answer in time, or with what is no list: half a list is none
std::optional<std::vector<Station>> ListStations(ControlSocket &control);

} // namespace vornhost

#endif
