// Messages of any content from the home's network, and the lease and presence files: nothing that is kept of them holds
// a control character, broken UTF-8 or more than 255 bytes, and no location leads to another host.
#include "host/devices/device_text.h"
#include "host/devices/dns_message.h"
#include "host/devices/lease_file.h"
#include "host/devices/mac_address.h"
#include "host/devices/neighbours.h"
#include "host/devices/node_status.h"
#include "host/devices/presence_file.h"
#include "host/devices/ssdp.h"
#include "host/network/ipv4.h"

#include <cstdint>
#include <cstdlib>

namespace {

constexpr uint32_t kSender = 0xc0a8016f;

void Demand(bool holds) {
  if (!holds) {
    std::abort();
  }
}

void CheckFinding(const vornhost::Finding &finding) {
  Demand(vornhost::IsCleanText(finding.name) && vornhost::IsCleanText(finding.type) &&
         vornhost::IsCleanText(finding.model));
}

void CheckLocation(std::string_view message) {
  const std::string sender = vornhost::Ipv4Text(kSender);
  const auto location = vornhost::ParseLocation(message, sender);
  if (location) {
    const std::string rest = location->substr(std::string("http://").size() + sender.size());
    Demand(location->starts_with("http://" + sender) && (rest[0] == '/' || rest[0] == ':'));
    Demand(rest.substr(0, rest.find('/')).find('@') == std::string::npos);
  }
}

void CheckFiles(std::string_view content) {
  for (const vornhost::Lease &lease : vornhost::ParseLeases(content)) {
    Demand(vornhost::ParseDeviceMac(lease.mac) == lease.mac && vornhost::ParseIpv4(lease.ip.c_str()).has_value() &&
           vornhost::IsCleanText(lease.name));
  }
  const vornhost::PresenceMap presence = vornhost::ParsePresence(content);
  Demand(vornhost::ParsePresence(vornhost::RenderPresence(presence)) == presence);
}

void CheckNeighbours(std::string_view messages) {
  std::vector<vornhost::DeviceNeighbour> neighbours;
  vornhost::ParseNeighbours(messages, {{3, "lbr0", "", {}, {}}}, neighbours);
  for (const vornhost::DeviceNeighbour &neighbour : neighbours) {
    Demand(vornhost::ParseDeviceMac(neighbour.mac) == neighbour.mac && !neighbour.address.empty());
  }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  if (size == 0) {
    return 0;
  }
  const std::string_view message(reinterpret_cast<const char *>(data) + 1, size - 1);
  switch (data[0] % 6) {
  case 0:
    CheckFinding(vornhost::ParseAnswer(message, kSender));
    break;
  case 1:
    CheckFinding({vornhost::ParseNodeStatus(message, 7), "", ""});
    break;
  case 2:
    CheckLocation(message);
    break;
  case 3:
    CheckFinding(vornhost::ParseDescription(message));
    break;
  case 4:
    CheckFiles(message);
    break;
  default:
    CheckNeighbours(message);
    break;
  }
  return 0;
}
