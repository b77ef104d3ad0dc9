// One port forward: the texts of its record, read and checked.
#ifndef HOST_PORTFORWARD_RULE_H
#define HOST_PORTFORWARD_RULE_H

#include "platform/utility.h"

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <variant>

namespace vornhost {

struct PortRange {
  uint16_t first = 0;
  uint16_t last = 0;

  int Count() const { return last - first + 1; }
  bool Holds(int port) const { return first <= port && port <= last; }
  bool operator==(const PortRange &) const = default;
};

/// "8080" or "5000-5010".
std::string PortText(const PortRange &range);

/// A rule whose every field is what it should be.
struct Forward {
  bool tcp = false;
  bool udp = false;
  PortRange outer;     ///< on the WAN side
  uint32_t target = 0; ///< LAN host, in host order
  PortRange inner;     ///< as many ports as `outer`, or one to which all of them go

  /// @param[in] port  one of `outer`
  uint16_t InnerPort(uint16_t port) const;
  /// As "tcp 8080 -> 192.168.1.110:80".
  std::string Describe(std::string_view protocol) const;
};

/// Why a rule is left out. The field has its name of the API.
struct RuleFault {
  std::string field;
  std::string value;
  std::string why;
};

/// @return one port or a range in decimal digits; nothing when a port is not 1 to 65535 or the range runs backwards
std::optional<PortRange> ParsePorts(std::string_view text);

/// Checks what can be told from the rule alone.
/// @param[in] values  a record of the rule file
std::variant<Forward, RuleFault> ParseRule(const QARDCSzHash &values);

} // namespace vornhost

#endif
