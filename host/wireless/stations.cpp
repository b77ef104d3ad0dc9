#include "host/wireless/stations.h"

#include "host/network/mac_address.h"
#include "host/utility/line_file.h"

#include <charconv>
#include <set>
#include <string_view>
#include <utility>

namespace vornhost {

namespace {

template <typename Number> std::optional<Number> ParseNumber(std::string_view text) {
  Number value{};
  const auto [end, fault] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (fault != std::errc() || end != text.data() + text.size()) {
    return std::nullopt;
  }
  return value;
}

void TakeFact(std::string_view key, std::string_view value, Station &station) {
  if (key == "flags") {
    station.authorized = value.find("[AUTHORIZED]") != std::string_view::npos;
  } else if (key == "signal") {
    station.signal = ParseNumber<int>(value);
  } else if (key == "rx_bytes") {
    station.received = ParseNumber<uint64_t>(value);
  } else if (key == "tx_bytes") {
    station.sent = ParseNumber<uint64_t>(value);
  }
}

enum class WalkEnd { kWhole, kLost, kFault };

// hostapd gives the station after a given one. When that one has left meanwhile it does not know where to go on, and
// the walk is lost.
WalkEnd Walk(ControlSocket &control, std::vector<Station> &stations) {
  std::set<std::string> seen;
  std::string request = "STA-FIRST";
  for (;;) {
    const auto answer = control.Ask(request);
    if (!answer) {
      return WalkEnd::kFault;
    }
    if (answer->empty()) {
      return WalkEnd::kWhole;
    }
    if (*answer == "FAIL\n" && !stations.empty()) {
      return WalkEnd::kLost;
    }
    auto station = ParseStation(*answer);
    if (!station || stations.size() == kStationLimit || !seen.insert(station->mac).second) {
      return WalkEnd::kFault;
    }
    request = "STA-NEXT " + station->mac;
    stations.push_back(std::move(*station));
  }
}

} // namespace

std::optional<Station> ParseStation(const std::string &answer) {
  if (answer.empty() || answer.back() != '\n') { // cut short
    return std::nullopt;
  }
  LineReader lines(answer);
  std::string_view line;
  lines.Next(line);
  const auto mac = ParseMac(line);
  if (!mac) {
    return std::nullopt;
  }
  Station station;
  station.mac = *mac;
  bool hasFlags = false;
  while (lines.Next(line)) {
    const size_t equals = line.find('=');
    if (equals != std::string_view::npos) {
      const std::string_view key = line.substr(0, equals);
      hasFlags = hasFlags || key == "flags";
      TakeFact(key, line.substr(equals + 1), station);
    }
  }
  if (!hasFlags) {
    return std::nullopt;
  }
  return station;
}

std::optional<std::vector<Station>> ListStations(ControlSocket &control) {
  constexpr int kTries = 3;
  for (int i = 0; i < kTries; ++i) {
    std::vector<Station> stations;
    switch (Walk(control, stations)) {
    case WalkEnd::kWhole:
      return stations;
    case WalkEnd::kLost:
      break;
    case WalkEnd::kFault:
      return std::nullopt;
    }
  }
  return std::nullopt;
}

} // namespace vornhost
