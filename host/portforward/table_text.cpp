#include "host/portforward/table_text.h"

#include "host/network/ipv4.h"

#include <netinet/in.h>

namespace vornhost {

namespace {

using State = PlannedRule::State;

constexpr char kFrame[] = R"(table ip vorn_dnat {
  set cut {
    type ipv4_addr . inet_proto . inet_service . ipv4_addr . inet_service
    size 65535
    flags dynamic,timeout
    timeout 5m
  }
  chain tcp_forwards {
  }
  chain udp_forwards {
  }
  chain inbound {
  }
  chain cut_off {
  }
  chain prerouting {
    type nat hook prerouting priority dstnat; policy accept;
  }
  chain postrouting {
    type nat hook postrouting priority srcnat; policy accept;
  }
  chain forward {
    type filter hook forward priority filter - 10; policy accept;
  }
}
flush table ip vorn_dnat
)";

constexpr char kCutRules[] = R"(  chain cut_off {
    update @cut { ip saddr . meta l4proto . th sport . ip daddr . th dport }
    meta l4proto tcp reject with tcp reset
    drop
  }
  chain forward {
    ct direction original meta l4proto { tcp, udp } ip saddr . meta l4proto . th sport . ip daddr . th dport @cut goto cut_off
  }
)";

// What stands between the items of a list.
template <typename Items, typename Render>
std::string Join(const Items &items, const char *between, const Render &render) {
  std::string out;
  for (const auto &item : items) {
    out.append(out.empty() ? "" : between).append(render(item));
  }
  return out;
}

// nft has no shift by a number: ports that change in a range stand in a map one by one.
std::string Ports(const Forward &forward, const std::string &protocol) {
  if (forward.inner == forward.outer) {
    return "";
  }
  if (forward.inner.Count() == 1) {
    return ":" + std::to_string(forward.inner.first);
  }
  std::string pairs;
  for (int port = forward.outer.first; port <= forward.outer.last; ++port) {
    pairs.append(pairs.empty() ? "" : ", ").append(std::to_string(port)).append(" : ");
    pairs.append(std::to_string(forward.InnerPort(static_cast<uint16_t>(port))));
  }
  return " : " + protocol + " dport map { " + pairs + " }";
}

std::string ForwardChain(const Plan &plan, const char *protocol, bool Forward::*wanted) {
  std::string out = std::string("  chain ") + protocol + "_forwards {\n";
  for (size_t number = 0; number < plan.rules.size(); ++number) {
    const Forward &forward = plan.rules[number].forward;
    if (plan.rules[number].state != State::kActive || !(forward.*wanted)) {
      continue;
    }
    out.append("    ").append(protocol).append(" dport ").append(PortText(forward.outer)).append(" dnat to ");
    out.append(Ipv4Text(forward.target)).append(Ports(forward, protocol)).append(" comment \"");
    out.append(RuleComment(number, forward, protocol)).append("\"\n");
  }
  return out + "  }\n";
}

std::string InboundChain(const Plan &plan) {
  std::string out = "  chain inbound {\n    meta l4proto vmap { tcp : jump tcp_forwards, udp : jump udp_forwards }\n";
  if (plan.dmzState == State::kActive) {
    const auto &ports = plan.surroundings.managementPorts;
    if (!ports.empty()) {
      out += "    tcp dport { " + Join(ports, ", ", [](uint16_t port) { return std::to_string(port); }) + " } return\n";
    }
    out += "    udp dport " + std::to_string(kDhcpClientPort) + " return\n";
    out += "    meta l4proto != icmp dnat to " + Ipv4Text(plan.dmz) + " comment \"" + DmzComment(plan) + "\"\n";
  }
  return out + "  }\n";
}

// Without a LAN there is nowhere to forward to.
std::string HookChains(const std::vector<Lan> &lans) {
  if (lans.empty()) {
    return "";
  }
  std::string out = "  chain prerouting {\n    fib daddr type local ip daddr != { 127.0.0.0/8, " +
                    Join(lans, ", ", [](const Lan &lan) { return Ipv4Text(lan.address); }) + " } goto inbound\n  }\n";
  out += "  chain postrouting {\n";
  for (const Lan &lan : lans) {
    out += "    ip saddr " + lan.Text() + " ip daddr " + lan.Text() + " ct status dnat masquerade\n";
  }
  return out + "  }\n";
}

} // namespace

std::string RuleComment(size_t number, const Forward &forward, const char *protocol) {
  return "rule " + std::to_string(number) + " " + forward.Describe(protocol);
}

std::string DmzComment(const Plan &plan) {
  return "DMZ " + Ipv4Text(plan.dmz);
}

std::string RenderTable(const Plan &plan) {
  std::string out = kFrame;
  out += "table ip vorn_dnat {\n";
  out += ForwardChain(plan, "tcp", &Forward::tcp);
  out += ForwardChain(plan, "udp", &Forward::udp);
  out += InboundChain(plan);
  out += kCutRules;
  out += HookChains(plan.surroundings.lans);
  return out + "}\n";
}

std::set<std::string> RuleComments(const Plan &plan) {
  std::set<std::string> comments;
  for (size_t number = 0; number < plan.rules.size(); ++number) {
    const PlannedRule &rule = plan.rules[number];
    if (rule.state == State::kActive && rule.forward.tcp) {
      comments.insert(RuleComment(number, rule.forward, "tcp"));
    }
    if (rule.state == State::kActive && rule.forward.udp) {
      comments.insert(RuleComment(number, rule.forward, "udp"));
    }
  }
  if (plan.dmzState == State::kActive) {
    comments.insert(DmzComment(plan));
  }
  return comments;
}

std::string RenderCuts(const std::vector<CutFlow> &flows) {
  return "add element ip vorn_dnat cut { " +
         Join(flows, ", ",
              [](const CutFlow &flow) {
                return Ipv4Text(flow.source) + " . " + (flow.protocol == IPPROTO_TCP ? "tcp" : "udp") + " . " +
                       std::to_string(flow.sourcePort) + " . " + Ipv4Text(flow.destination) + " . " +
                       std::to_string(flow.destinationPort);
              }) +
         " }\n";
}

} // namespace vornhost
