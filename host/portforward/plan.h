// What the rule file and the DMZ file ask for, checked against the router's networks: what will be installed, and what
// is left out and why. Each rule is judged alone; one that is not valid costs no other rule.
#ifndef HOST_PORTFORWARD_PLAN_H
#define HOST_PORTFORWARD_PLAN_H

#include "host/portforward/rule.h"
#include "platform/portforward.h"

#include <string>
#include <vector>

namespace vornhost {

/// The DMZ host does not get what the provider's DHCP server sends to the router.
constexpr uint16_t kDhcpClientPort = 68;

/// A LAN-side interface's network.
struct Lan {
  uint32_t address = 0; ///< the router's own, in host order
  int prefix = 0;

  bool Holds(uint32_t host) const;
  /// Whether `host` can be a device's: not the network's own address, the broadcast address, or the router's.
  bool IsDevice(uint32_t host) const;
  /// As "192.168.1.0/24".
  std::string Text() const;
};

/// What the rules are judged by.
struct Surroundings {
  std::vector<Lan> lans;
  std::vector<uint16_t> managementPorts; ///< TCP ports on which the router's own page is served
};

struct PlannedRule {
  enum class State { kActive, kDisabled, kLeftOut };
  State state = State::kLeftOut;
  std::string name; ///< as `rule 3 "Web"`, fit for the log
  std::string why;  ///< it is left out: as `sourcePort "0": no port`
  Forward forward;  ///< when it is active
};

struct DmzTexts {
  std::string enabled; ///< "yes" or anything else
  std::string ip;
};

struct Plan {
  Surroundings surroundings;
  std::vector<PlannedRule> rules; ///< in the order of the file; a rule's index is its number
  PlannedRule::State dmzState = PlannedRule::State::kDisabled;
  std::string dmzWhy;
  uint32_t dmz = 0;

  struct Target {
    uint32_t address = 0;
    uint16_t port = 0; ///< 0 for a protocol without ports
  };
  /// @param[in] protocol  IPPROTO_*
  /// @param[in] port      0 for a protocol without ports
  /// @return where a connection from outside to the router goes; nothing when it stays at the router
  std::optional<Target> Find(int protocol, uint16_t port) const;
};

/// @param[in] records  the rule file's list; null when it is empty
Plan MakePlan(const VORNPFRecord *records, const DmzTexts &dmz, const Surroundings &surroundings);

} // namespace vornhost

#endif
