#include "host/portforward/plan.h"

#include "host/network/ipv4.h"
#include "host/utility/log.h"
#include "host/utility/sz_hash.h"

#include <netinet/in.h>

#include <algorithm>
#include <map>
#include <utility>

namespace vornhost {

namespace {

using State = PlannedRule::State;

constexpr size_t kShownBytes = 64; // of a foreign text

std::string Quoted(std::string_view text) {
  return "\"" + LogText(text, kShownBytes) + "\"";
}

std::string Text(const RuleFault &fault) {
  return fault.field + (fault.why == "missing" ? "" : " " + Quoted(fault.value)) + ": " + fault.why;
}

// The outer ports that earlier rules have, of one protocol. The ranges do not overlap.
class TakenPorts {
public:
  /// @return the number of a rule that has one of these ports; nothing when they are free
  std::optional<size_t> FindOwner(const PortRange &range) const {
    const auto after = byFirst_.upper_bound(range.last);
    if (after == byFirst_.begin() || std::prev(after)->second.last < range.first) {
      return std::nullopt;
    }
    return std::prev(after)->second.rule;
  }
  void Take(const PortRange &range, size_t rule) { byFirst_[range.first] = {range.last, rule}; }

private:
  struct Owner {
    uint16_t last = 0;
    size_t rule = 0;
  };
  std::map<uint16_t, Owner> byFirst_;
};

// Why `host` cannot be forwarded to; empty when it can.
std::string JudgeTarget(uint32_t host, const std::vector<Lan> &lans) {
  const auto holds = [&host](const Lan &lan) { return lan.Holds(host); };
  if (std::none_of(lans.begin(), lans.end(), holds)) {
    return "in no LAN of this router";
  }
  if (std::any_of(lans.begin(), lans.end(), [&host](const Lan &lan) { return lan.address == host; })) {
    return "the router's own address";
  }
  const auto refuses = [&host](const Lan &lan) { return lan.Holds(host) && !lan.IsDevice(host); };
  return std::any_of(lans.begin(), lans.end(), refuses) ? "no device's address" : "";
}

class Planner {
public:
  explicit Planner(Plan &plan) : plan_(plan) {}

  void Add(const VORNPFRecord &record) {
    const size_t number = plan_.rules.size();
    PlannedRule &rule = plan_.rules.emplace_back();
    const std::string *service = record.values->Find("service");
    const std::string *enabled = record.values->Find("enabled");
    rule.name = "rule " + std::to_string(number) + " " + Quoted(service == nullptr ? "" : *service);
    if (enabled == nullptr || *enabled != "1") {
      rule.state = State::kDisabled;
      return;
    }
    const auto parsed = ParseRule(*record.values);
    if (const auto *fault = std::get_if<RuleFault>(&parsed); fault != nullptr) {
      rule.why = Text(*fault);
      return;
    }
    rule.forward = std::get<Forward>(parsed);
    rule.why = Judge(rule.forward);
    if (rule.why.empty()) {
      rule.state = State::kActive;
      Take(rule.forward, number);
    }
  }

private:
  std::string Judge(const Forward &forward) const {
    const std::string why = JudgeTarget(forward.target, plan_.surroundings.lans);
    if (!why.empty()) {
      return Text(RuleFault{"targetIP", Ipv4Text(forward.target), why});
    }
    const RuleFault fault{"sourcePort", PortText(forward.outer), JudgePorts(forward)};
    return fault.why.empty() ? "" : Text(fault);
  }

  std::string JudgePorts(const Forward &forward) const {
    for (const uint16_t port : plan_.surroundings.managementPorts) {
      if (forward.tcp && forward.outer.Holds(port)) {
        return "has the router's management port " + std::to_string(port);
      }
    }
    auto owner = forward.tcp ? tcp_.FindOwner(forward.outer) : std::nullopt;
    if (!owner && forward.udp) {
      owner = udp_.FindOwner(forward.outer);
    }
    if (!owner) {
      return "";
    }
    const PlannedRule &other = plan_.rules[*owner];
    return other.name + " has " + PortText(other.forward.outer);
  }

  void Take(const Forward &forward, size_t number) {
    if (forward.tcp) {
      tcp_.Take(forward.outer, number);
    }
    if (forward.udp) {
      udp_.Take(forward.outer, number);
    }
  }

  Plan &plan_;
  TakenPorts tcp_;
  TakenPorts udp_;
};

void PlanDmz(const DmzTexts &texts, Plan &plan) {
  if (texts.enabled != "yes") {
    return;
  }
  const auto address = ParseIpv4(texts.ip.c_str());
  const std::string why = address ? JudgeTarget(*address, plan.surroundings.lans) : "no IPv4 address";
  plan.dmzState = why.empty() ? State::kActive : State::kLeftOut;
  plan.dmz = why.empty() ? *address : 0;
  plan.dmzWhy = why.empty() ? "" : Text(RuleFault{"ip", texts.ip, why});
}

} // namespace

bool Lan::Holds(uint32_t host) const {
  return ((host ^ address) & NetmaskOfPrefix(prefix)) == 0;
}

// In a network of one or two addresses every address is a host's (RFC 3021).
bool Lan::IsDevice(uint32_t host) const {
  const uint32_t mask = NetmaskOfPrefix(prefix);
  const bool named = prefix < 31 && ((host & ~mask) == 0 || (host | mask) == UINT32_MAX);
  return Holds(host) && host != address && !named;
}

std::string Lan::Text() const {
  return Ipv4Text(address & NetmaskOfPrefix(prefix)) + "/" + std::to_string(prefix);
}

std::optional<Plan::Target> Plan::Find(int protocol, uint16_t port) const {
  const bool tcp = protocol == IPPROTO_TCP;
  const bool udp = protocol == IPPROTO_UDP;
  for (const PlannedRule &rule : rules) {
    const Forward &forward = rule.forward;
    if (rule.state == State::kActive && ((tcp && forward.tcp) || (udp && forward.udp)) && forward.outer.Holds(port)) {
      return Target{forward.target, forward.InnerPort(port)};
    }
  }
  const auto &own = surroundings.managementPorts;
  const bool routersOwn = protocol == IPPROTO_ICMP || (udp && port == kDhcpClientPort) ||
                          (tcp && std::find(own.begin(), own.end(), port) != own.end());
  if (dmzState != State::kActive || routersOwn) {
    return std::nullopt;
  }
  return Target{dmz, port};
}

Plan MakePlan(const VORNPFRecord *records, const DmzTexts &dmz, const Surroundings &surroundings) {
  Plan plan;
  plan.surroundings = surroundings;
  Planner planner(plan);
  for (const VORNPFRecord *record = records; record != nullptr; record = record->next) {
    planner.Add(*record);
  }
  PlanDmz(dmz, plan);
  return plan;
}

} // namespace vornhost
