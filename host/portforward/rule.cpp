#include "host/portforward/rule.h"

#include "host/network/ipv4.h"
#include "host/utility/sz_hash.h"

#include <algorithm>
#include <cctype>
#include <charconv>

namespace vornhost {

namespace {

constexpr int kHighestPort = 65535;

struct Protocol {
  std::string_view text;
  bool tcp;
  bool udp;
};
constexpr Protocol kProtocols[] = {
    {"tcp", true, false}, {"udp", false, true}, {"both", true, true}, {"tcp/udp", true, true}};

std::optional<uint16_t> ParsePort(std::string_view text) {
  int port = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), port);
  // A leading zero may mean octal to somebody; from_chars takes a minus sign.
  if (error != std::errc() || end != text.data() + text.size() || text.front() == '0' || port < 1 ||
      port > kHighestPort) {
    return std::nullopt;
  }
  return static_cast<uint16_t>(port);
}

const Protocol *FindProtocol(std::string_view text) {
  const auto sameLetters = [](char a, char b) { return std::tolower(static_cast<unsigned char>(a)) == b; };
  const auto *found = std::find_if(std::begin(kProtocols), std::end(kProtocols), [&](const Protocol &protocol) {
    return std::equal(text.begin(), text.end(), protocol.text.begin(), protocol.text.end(), sameLetters);
  });
  return found == std::end(kProtocols) ? nullptr : found;
}

// A field of the record, and what is wrong with it.
class Field {
public:
  Field(const QARDCSzHash &values, const char *key, const char *apiName) : text_(values.Find(key)), apiName_(apiName) {}

  const char *Text() const { return text_ == nullptr ? "" : text_->c_str(); }
  RuleFault Fault(const char *why) const { return {apiName_, Text(), text_ == nullptr ? "missing" : why}; }

private:
  const std::string *text_;
  const char *apiName_;
};

} // namespace

std::string PortText(const PortRange &range) {
  const std::string first = std::to_string(range.first);
  return range.Count() == 1 ? first : first + "-" + std::to_string(range.last);
}

uint16_t Forward::InnerPort(uint16_t port) const {
  return inner.Count() == 1 ? inner.first : static_cast<uint16_t>(inner.first + (port - outer.first));
}

std::string Forward::Describe(std::string_view protocol) const {
  std::string text(protocol);
  return text.append(" ")
      .append(PortText(outer))
      .append(" -> ")
      .append(Ipv4Text(target))
      .append(":")
      .append(PortText(inner));
}

std::optional<PortRange> ParsePorts(std::string_view text) {
  const size_t dash = text.find('-');
  const auto first = ParsePort(text.substr(0, dash));
  const auto last = dash == std::string_view::npos ? first : ParsePort(text.substr(dash + 1));
  if (!first || !last || *last < *first) {
    return std::nullopt;
  }
  return PortRange{*first, *last};
}

std::variant<Forward, RuleFault> ParseRule(const QARDCSzHash &values) {
  const Field outer(values, "r_port", "sourcePort");
  const Field protocolField(values, "protocol name", "protocol");
  const Field target(values, "s_ip", "targetIP");
  const Field inner(values, "s_port", "targetPort");
  constexpr const char *kNoPorts = "no port from 1 to 65535 and no range of them";

  const auto outerPorts = ParsePorts(outer.Text());
  if (!outerPorts) {
    return outer.Fault(kNoPorts);
  }
  const Protocol *protocol = FindProtocol(protocolField.Text());
  if (protocol == nullptr) {
    return protocolField.Fault("not tcp, udp or both");
  }
  const auto address = ParseIpv4(target.Text());
  if (!address) {
    return target.Fault("no IPv4 address");
  }
  const auto innerPorts = ParsePorts(inner.Text());
  if (!innerPorts) {
    return inner.Fault(kNoPorts);
  }
  if (innerPorts->Count() != 1 && innerPorts->Count() != outerPorts->Count()) {
    return inner.Fault("a range of another length than sourcePort's");
  }
  return Forward{protocol->tcp, protocol->udp, *outerPorts, *address, *innerPorts};
}

} // namespace vornhost
