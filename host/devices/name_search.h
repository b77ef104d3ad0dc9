// Asks the devices of the home what they are called, and listens to what they announce: multicast DNS, SSDP, NetBIOS.
//
// Each bridge has sockets of its own, bound to it: what comes in through one can only be its devices', and nothing goes
// out by the WAN.
#ifndef HOST_DEVICES_NAME_SEARCH_H
#define HOST_DEVICES_NAME_SEARCH_H

#include "host/devices/device_table.h"
#include "host/devices/neighbours.h"
#include "host/utility/unique_fd.h"

#include <functional>
#include <string>
#include <vector>

namespace vornhost {

class NameSearch {
public:
  struct Handlers {
    std::function<void(Source source, const std::string &netif, uint32_t ip, const Finding &finding)> finding;
    /// A device says where it describes itself.
    std::function<void(const std::string &netif, uint32_t ip, const std::string &url)> location;
  };

  explicit NameSearch(Handlers handlers);

  /// Opens and closes sockets so that each bridge that has an address has its own.
  void Follow(const std::vector<Bridge> &bridges);

  /// Asks everybody on every bridge but the guests': services by multicast DNS, root devices by SSDP.
  void AskAll() const;
  /// Asks these for their names: NetBIOS, and multicast DNS by address; guests for their services as well.
  void Ask(const std::vector<Inquiry> &inquiries) const;

  /// The sockets, for poll(2).
  std::vector<int> Fds() const;
  /// Reads what has come, so much at once that nobody can keep the scanner busy with it.
  void Receive() const;

private:
  struct Ears {
    Bridge bridge;
    UniqueFd ask;      // whence questions go, and where their answers come to
    UniqueFd dns;      // announcements by multicast DNS
    UniqueFd announce; // announcements by SSDP

    bool IsGuests() const;
  };

  static Ears Open(const Bridge &bridge);
  static void AskGuest(const Ears &ears, uint32_t ip);
  void ReceiveFrom(const Ears &ears, const UniqueFd &fd) const;
  void Take(const Ears &ears, bool isAnswer, std::string_view message, uint32_t ip, uint16_t port) const;

  Handlers handlers_;
  uint16_t id_; // of the NetBIOS requests: who does not hear them cannot answer
  std::vector<Ears> ears_;
};

} // namespace vornhost

#endif
