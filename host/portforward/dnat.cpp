#include "host/portforward/dnat.h"

#include "host/network/ipv4.h"
#include "host/network/names.h"
#include "host/network/netlink.h"
#include "host/nftables/nftables.h"
#include "host/portforward/connections.h"
#include "host/portforward/plan.h"
#include "host/portforward/record_text.h"
#include "host/portforward/table_text.h"
#include "host/utility/atomic_file.h"
#include "host/utility/error.h"
#include "host/utility/line_file.h"
#include "host/utility/log.h"
#include "host/utility/unique_fd.h"
#include "platform/netif.h"

#include <fcntl.h>
#include <netinet/in.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <cstring>
#include <system_error>

namespace vornhost {

namespace {

using State = PlannedRule::State;

constexpr char kRuleFile[] = "/etc/portforward/routerpf/rule.conf";
constexpr char kDmzFile[] = "/etc/portforward/routerpf/dmz.conf";
constexpr char kServerConfig[] = "/etc/vorn/webd.conf";
constexpr uint16_t kServerPort = 8080; // when its configuration says nothing
constexpr char kTable[] = "ip vorn_dnat";
constexpr int kLanCapacity = 32;

// A file that is not there holds nothing; one that cannot be read must not be taken for empty.
bool ReadRules(RecordList &records) {
  if (QARDCFileExist(kRuleFile) == 0) {
    return true;
  }
  VORNPFRecord *head = nullptr;
  if (VORNPFConfGet(&head, kRuleFile, 0, 0, 0) < 0) {
    LogError("%s cannot be read: error 0x%04X", kRuleFile, static_cast<unsigned>(QARDCErrGet()));
    return false;
  }
  records.reset(head);
  return true;
}

bool ReadDmz(DmzTexts &texts) {
  if (QARDCFileExist(kDmzFile) == 0) {
    return true;
  }
  std::array<char, 1024> text{};
  for (const auto &[key, value] : {std::pair("enabled", &texts.enabled), std::pair("dmz_ip", &texts.ip)}) {
    if (QARDCFileGetKeyValue(kDmzFile, key, text.data(), text.size(), 0) < 0) {
      LogError("%s cannot be read: error 0x%04X", kDmzFile, static_cast<unsigned>(QARDCErrGet()));
      return false;
    }
    *value = text.data();
  }
  return true;
}

bool ReadLans(std::vector<Lan> &lans) {
  std::array<QARDNetInterface, kLanCapacity> entries{};
  const int count = QARDNetInterfaceEnum(entries.data(), kLanCapacity, QARD_NETIF_LAN);
  if (count < 0) {
    LogError("the LAN interfaces cannot be read: error 0x%04X", static_cast<unsigned>(QARDCErrGet()));
    return false;
  }
  for (int i = 0; i < count; ++i) {
    const QARDNetInterface &entry = entries[static_cast<size_t>(i)];
    const auto address = ParseIpv4(entry.ip);
    const auto prefix = PrefixOfNetmask(entry.mask);
    const auto same = [&address](const Lan &lan) { return lan.address == *address; };
    if (address && prefix && std::none_of(lans.begin(), lans.end(), same)) {
      lans.push_back({*address, *prefix});
    }
  }
  return true;
}

// The server's configuration has a line such as "listen=127.0.0.1:8080" for each of its sockets.
std::vector<uint16_t> ReadManagementPorts() {
  std::string content;
  std::vector<uint16_t> ports;
  if (ReadWholeFile(kServerConfig, content) != 0) {
    return {kServerPort};
  }
  LineReader reader(content);
  for (std::string_view text; reader.Next(text);) {
    const Line line = ParseLine(text);
    if (line.kind == Line::Kind::kPair && line.key.starts_with("listen")) {
      const auto port = ParsePorts(line.value.substr(line.value.rfind(':') + 1));
      if (port && port->Count() == 1 && std::find(ports.begin(), ports.end(), port->first) == ports.end()) {
        ports.push_back(port->first);
      }
    }
  }
  return ports.empty() ? std::vector{kServerPort} : ports;
}

std::optional<Plan> ReadPlan() {
  RecordList records;
  DmzTexts dmz;
  Surroundings surroundings;
  if (!ReadRules(records) || !ReadDmz(dmz) || !ReadLans(surroundings.lans)) {
    return std::nullopt;
  }
  surroundings.managementPorts = ReadManagementPorts();
  return MakePlan(records.get(), dmz, surroundings);
}

// @return the lock, held until it is closed; closed when it cannot be had
UniqueFd TakeTurn() {
  if (mkdir(kRunFolder, 0700) != 0 && errno != EEXIST) { // whoever could open it could hold every change up
    LogError("%s: %s", kRunFolder, std::strerror(errno));
    return UniqueFd();
  }
  const std::string path = std::string(kRunFolder) + "/dnat.lock";
  UniqueFd lock(open(path.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0600));
  int result = -1;
  while (lock.IsOpen() && (result = flock(lock.Get(), LOCK_EX)) != 0 && errno == EINTR) {
  }
  if (result != 0) {
    LogError("%s: %s", path.c_str(), std::strerror(errno));
    lock.Reset();
  }
  return lock;
}

// A connection to one of the router's own outer addresses that goes elsewhere than the plan says. Others translate
// destinations too; what they do is left alone.
bool IsStale(const TranslatedConnection &connection, const Plan &plan, const std::vector<uint32_t> &ownAddresses) {
  const auto &lans = plan.surroundings.lans;
  const auto isLans = [&connection](const Lan &lan) { return lan.address == connection.outerAddress; };
  if (std::find(ownAddresses.begin(), ownAddresses.end(), connection.outerAddress) == ownAddresses.end() ||
      std::any_of(lans.begin(), lans.end(), isLans)) {
    return false;
  }
  const auto target = plan.Find(connection.protocol, connection.outerPort);
  return !target || target->address != connection.target || target->port != connection.targetPort;
}

std::vector<uint32_t> OwnAddresses() {
  std::vector<uint32_t> out;
  for (const Address &address : Netlink().Addresses()) {
    if (const auto host = address.family == AF_INET ? ParseIpv4(address.Host().c_str()) : std::nullopt; host) {
      out.push_back(*host);
    }
  }
  return out;
}

void CutStale(const Plan &plan, Nftables &nftables) {
  Connections connections;
  std::vector<TranslatedConnection> stale = connections.List();
  const auto ownAddresses = OwnAddresses();
  std::erase_if(stale, [&](const TranslatedConnection &one) { return !IsStale(one, plan, ownAddresses); });
  std::vector<CutFlow> flows;
  for (const TranslatedConnection &one : stale) {
    if (one.protocol == IPPROTO_TCP || one.protocol == IPPROTO_UDP) {
      flows.push_back({one.target, one.protocol, one.targetPort, one.peer, one.peerPort});
    }
  }
  if (!flows.empty()) {
    nftables.Run(RenderCuts(flows));
  }
  for (const TranslatedConnection &one : stale) {
    connections.Delete(one);
  }
  if (!stale.empty()) {
    LogInfo("%zu connections of removed forwards ended", stale.size());
  }
}

void LogLeftOut(const Plan &plan) {
  for (const PlannedRule &rule : plan.rules) {
    if (rule.state == State::kLeftOut) {
      LogError("%s left out: %s", rule.name.c_str(), rule.why.c_str());
    }
  }
  if (plan.dmzState == State::kLeftOut) {
    LogError("DMZ left out: %s", plan.dmzWhy.c_str());
  }
}

bool IsInstalled(const Forward &forward, size_t number, const std::set<std::string> &installed) {
  const auto isThere = [&](const char *protocol) {
    return installed.count(RuleComment(number, forward, protocol)) != 0;
  };
  return (!forward.tcp || isThere("tcp")) && (!forward.udp || isThere("udp"));
}

std::string Verdict(const PlannedRule &rule, size_t number, const std::set<std::string> &installed) {
  switch (rule.state) {
  case State::kDisabled:
    return "disabled";
  case State::kLeftOut:
    return "left out: " + rule.why;
  case State::kActive:
    break;
  }
  const std::string protocol = rule.forward.tcp && rule.forward.udp ? "tcp/udp" : rule.forward.tcp ? "tcp" : "udp";
  return (IsInstalled(rule.forward, number, installed) ? "installed: " : "NOT INSTALLED: ") +
         rule.forward.Describe(protocol);
}

std::string DmzVerdict(const Plan &plan, const std::set<std::string> &installed) {
  switch (plan.dmzState) {
  case State::kDisabled:
    return "off";
  case State::kLeftOut:
    return "left out: " + plan.dmzWhy;
  case State::kActive:
    break;
  }
  return (installed.count(DmzComment(plan)) != 0 ? "installed: " : "NOT INSTALLED: ") + Ipv4Text(plan.dmz);
}

} // namespace

bool StartDnat() {
  const UniqueFd turn = TakeTurn();
  const auto plan = turn.IsOpen() ? ReadPlan() : std::nullopt;
  if (!plan) {
    return false;
  }
  LogLeftOut(*plan);
  Nftables nftables;
  if (!nftables.Run(RenderTable(*plan))) {
    return false;
  }
  CutStale(*plan, nftables);
  return true;
}

bool ShowDnatStatus(std::ostream &out) {
  const auto plan = ReadPlan();
  std::set<std::string> installed;
  if (!plan || !Nftables().ReadComments(kTable, installed)) {
    out << "the rules or the table cannot be read\n";
    return false;
  }
  for (size_t number = 0; number < plan->rules.size(); ++number) {
    out << plan->rules[number].name << ": " << Verdict(plan->rules[number], number, installed) << '\n';
  }
  out << "DMZ: " << DmzVerdict(*plan, installed) << '\n';
  const std::set<std::string> wanted = RuleComments(*plan);
  for (const std::string &comment : installed) {
    if (wanted.count(comment) == 0) {
      out << "installed, but not stored: " << LogText(comment) << '\n';
    }
  }
  return installed == wanted;
}

} // namespace vornhost
