#include "host/devices/lease_file.h"

#include "host/devices/device.h"
#include "host/devices/device_text.h"
#include "host/devices/mac_address.h"
#include "host/network/ipv4.h"
#include "host/utility/line_file.h"

#include <array>
#include <charconv>
#include <optional>
#include <unordered_map>

namespace vornhost {

namespace {

constexpr size_t kFields = 5;

std::optional<std::array<std::string_view, kFields>> FieldsOf(std::string_view line) {
  std::array<std::string_view, kFields> fields;
  for (size_t i = 0; i < kFields; ++i) {
    const size_t blank = i + 1 < kFields ? line.find(' ') : line.size();
    if (blank == std::string_view::npos || blank == 0) {
      return std::nullopt;
    }
    fields[i] = line.substr(0, blank);
    line.remove_prefix(std::min(blank + 1, line.size()));
  }
  return fields;
}

// Hardware types other than Ethernet stand before the address: "06-...".
std::optional<Lease> LeaseOf(std::string_view line) {
  const auto fields = FieldsOf(line);
  if (!fields) {
    return std::nullopt;
  }
  Lease lease;
  const std::string_view expiry = (*fields)[0];
  const auto [end, error] = std::from_chars(expiry.data(), expiry.data() + expiry.size(), lease.expiry);
  const std::optional<std::string> mac = ParseDeviceMac((*fields)[1]);
  const std::optional<uint32_t> ip = ParseIpv4(std::string((*fields)[2]).c_str());
  if (error != std::errc() || end != expiry.data() + expiry.size() || lease.expiry < 0 || !mac || !ip) {
    return std::nullopt;
  }
  lease.mac = *mac;
  lease.ip = Ipv4Text(*ip);
  lease.name = CleanName((*fields)[3]);
  return lease;
}

bool EndsLater(const Lease &one, const Lease &other) {
  return other.expiry != 0 && (one.expiry == 0 || one.expiry >= other.expiry);
}

} // namespace

std::vector<Lease> ParseLeases(std::string_view content) {
  std::vector<Lease> leases;
  std::unordered_map<std::string, size_t> places;
  content = content.substr(0, content.rfind('\n') + 1); // none: npos + 1, nothing
  LineReader lines(content);
  std::string_view line;
  while (lines.Next(line) && !line.starts_with("duid ") && leases.size() < kDeviceLimit) {
    std::optional<Lease> lease = LeaseOf(line);
    if (!lease) {
      continue;
    }
    const auto [place, isNew] = places.try_emplace(lease->mac, leases.size());
    if (isNew) {
      leases.push_back(std::move(*lease));
    } else if (EndsLater(*lease, leases[place->second])) {
      const std::string name = leases[place->second].name;
      leases[place->second] = std::move(*lease);
      if (leases[place->second].name.empty()) {
        leases[place->second].name = name;
      }
    }
  }
  return leases;
}

} // namespace vornhost
