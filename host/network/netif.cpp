#include "platform/netif.h"

#include "host/export.h"
#include "host/network/ipv4.h"
#include "host/network/names.h"
#include "host/network/netlink.h"
#include "host/utility/error.h"

#include <net/if.h>
#include <netinet/in.h>

#include <algorithm>
#include <cstring>
#include <unordered_map>

namespace vornhost {

namespace {

struct InterfaceAddress {
  std::string ip;
  std::string mask;
};

template <size_t size> void PutText(char (&field)[size], const std::string &text) {
  std::memcpy(field, text.data(), std::min(text.size(), size - 1));
}

InterfaceAddress Split(const Address &address) {
  const size_t slash = address.text.find('/'); // libnl leaves out "/32"
  const int prefix = slash == std::string::npos ? 32 : std::stoi(address.text.substr(slash + 1));
  return {address.Host(), Ipv4Text(NetmaskOfPrefix(prefix))};
}

// The first address of an interface is its primary one.
std::unordered_map<int, InterfaceAddress> FirstAddresses(Netlink &netlink) {
  std::unordered_map<int, InterfaceAddress> out;
  for (const Address &address : netlink.Addresses()) {
    if (address.family == AF_INET) {
      out.try_emplace(address.index, Split(address));
    }
  }
  return out;
}

// br0 is on the LAN side only while it is the one bridge.
bool IsLanBridge(const Link &link, int wanMaster) {
  return link.kind == "bridge" &&
         (link.name == kLanBridge || link.name == kGuestBridge || (link.name == kOneBridge && link.index == wanMaster));
}

int WanMaster(const std::vector<Link> &links) {
  const auto wan = std::find_if(links.begin(), links.end(), [](const Link &link) { return link.name == kWanPort; });
  return wan != links.end() && wan->master != 0 ? wan->master : -1;
}

int Enumerate(QARDNetInterface *entries, int capacity, int kind) {
  Netlink netlink;
  const std::vector<Link> links = netlink.Links();
  const auto addresses = FirstAddresses(netlink);
  const int wanMaster = WanMaster(links);
  int count = 0;
  for (const Link &link : links) {
    const auto address = addresses.find(link.index);
    const bool wanted = kind == QARD_NETIF_ALL || (address != addresses.end() && IsLanBridge(link, wanMaster));
    if (!wanted || count == capacity) {
      continue;
    }
    QARDNetInterface &entry = entries[count++];
    entry = {};
    PutText(entry.name, link.name);
    if (address != addresses.end()) {
      PutText(entry.ip, address->second.ip);
      PutText(entry.mask, address->second.mask);
    }
  }
  return count;
}

int GetInfo(const char *name, VORNNetIFInfo *info) {
  const unsigned index = if_nametoindex(name);
  if (index == 0) {
    return SetError(QARDC_ERR_NOT_FOUND);
  }
  Netlink netlink;
  const auto addresses = FirstAddresses(netlink);
  const auto address = addresses.find(static_cast<int>(index));
  if (address == addresses.end()) {
    return SetError(QARDC_ERR_NOT_FOUND);
  }
  *info = {};
  PutText(info->ip, address->second.ip);
  PutText(info->mask, address->second.mask);
  return 1;
}

} // namespace

} // namespace vornhost

using vornhost::Guarded;
using vornhost::SetError;

VORN_EXPORT int QARDNetInterfaceEnum(QARDNetInterface *entries, int capacity, int kind) {
  if (entries == nullptr || capacity < 0 || (kind != QARD_NETIF_ALL && kind != QARD_NETIF_LAN)) {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  return Guarded(-1, [&] { return vornhost::Enumerate(entries, capacity, kind); });
}

VORN_EXPORT int VORNNetIFGetInfo(const char *name, int flags, VORNNetIFInfo *info) {
  if (name == nullptr || info == nullptr || flags != 0) {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  return Guarded(-1, [&] { return vornhost::GetInfo(name, info); });
}

VORN_EXPORT int VORNNetIsSameSubnet(const char *address, const char *interfaceAddress, const char *interfaceNetmask) {
  if (address == nullptr || interfaceAddress == nullptr || interfaceNetmask == nullptr) {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  const auto host = vornhost::ParseIpv4(address);
  const auto network = vornhost::ParseIpv4(interfaceAddress);
  const auto prefix = vornhost::PrefixOfNetmask(interfaceNetmask);
  if (!host || !network || !prefix) {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  return ((*host ^ *network) & vornhost::NetmaskOfPrefix(*prefix)) == 0 ? 1 : 0;
}
