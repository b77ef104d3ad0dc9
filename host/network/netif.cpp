#include "platform/netif.h"

#include "host/export.h"
#include "host/network/ipv4.h"
#include "host/network/names.h"
#include "host/network/netlink.h"
#include "host/utility/error.h"
#include "host/utility/unique_fd.h"

#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <net/if.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <memory>
#include <mutex>
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

struct Interfaces {
  std::vector<Link> links;
  std::unordered_map<int, InterfaceAddress> addresses; // by the link's index
};

// The first address of an interface is its primary one.
Interfaces ReadInterfaces() {
  Netlink netlink;
  Interfaces out{netlink.Links(), {}};
  for (const Address &address : netlink.Addresses()) {
    if (address.family == AF_INET) {
      out.addresses.try_emplace(address.index, Split(address));
    }
  }
  return out;
}

// Reading them costs more than most calls that ask for them. The kernel tells of every change before the change's own
// call returns, so that what was read holds for as long as it has said nothing. A process stays in its network
// namespace.
class InterfaceKeeper {
public:
  std::shared_ptr<const Interfaces> Get() {
    const std::lock_guard lock(mutex_);
    if (!Watch() || HasNews()) {
      interfaces_.reset(); // also when reading them fails
    }
    if (!interfaces_) {
      interfaces_ = std::make_shared<const Interfaces>(ReadInterfaces());
    }
    return interfaces_;
  }

private:
  static constexpr int kQueueBytes = 4096; // what is in it is of no interest; that it runs over is news too

  /// @return false when what happened before now is not known
  bool Watch() {
    if (socket_.IsOpen() && owner_ == getpid()) { // a child would share the news with its parent
      return true;
    }
    socket_ = UniqueFd(socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC | SOCK_NONBLOCK, NETLINK_ROUTE));
    owner_ = getpid();
    sockaddr_nl address{};
    address.nl_family = AF_NETLINK;
    address.nl_groups = RTMGRP_LINK | RTMGRP_IPV4_IFADDR;
    if (!socket_.IsOpen() || setsockopt(socket_.Get(), SOL_SOCKET, SO_RCVBUF, &kQueueBytes, sizeof(kQueueBytes)) != 0 ||
        bind(socket_.Get(), reinterpret_cast<const sockaddr *>(&address), sizeof(address)) != 0) {
      socket_.Reset(); // then they are read each time
    }
    return false;
  }

  bool HasNews() {
    bool any = false;
    char byte = 0;
    while (recv(socket_.Get(), &byte, sizeof(byte), MSG_DONTWAIT) >= 0 || errno == ENOBUFS || errno == EINTR) {
      any = true;
    }
    return any;
  }

  std::mutex mutex_;
  UniqueFd socket_;
  pid_t owner_ = 0;
  std::shared_ptr<const Interfaces> interfaces_;
};

std::shared_ptr<const Interfaces> CurrentInterfaces() {
  static InterfaceKeeper keeper;
  return keeper.Get();
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
  const auto interfaces = CurrentInterfaces();
  const auto &[links, addresses] = *interfaces;
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
  const auto interfaces = CurrentInterfaces();
  const auto address = interfaces->addresses.find(static_cast<int>(index));
  if (address == interfaces->addresses.end()) {
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
