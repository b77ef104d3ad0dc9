#include "host/timecontrol/firewall.h"

#include "host/nftables/nftables.h"
#include "host/timecontrol/neighbours.h"

namespace vornhost {

namespace {

constexpr char kTable[] = "inet vorn_timecontrol";

constexpr char kAddressSet[] = " flags dynamic,timeout; timeout 8d; size 8192;";

// Both chains stand before those of others: learn before connection tracking, forward before the base firewall.
constexpr char kChains[] = R"(
  chain learn {
    type filter hook prerouting priority raw; policy accept;
    ether saddr @cut fib saddr . iif oif exists update @cut4 { ip saddr }
    ether saddr @cut fib saddr . iif oif exists update @cut6 { ip6 saddr }
    ip saddr @cut4 ether saddr != @cut delete @cut4 { ip saddr }
    ip6 saddr @cut6 ether saddr != @cut delete @cut6 { ip6 saddr }
  }
  chain forward {
    type filter hook forward priority filter - 10; policy accept;
    ether saddr @cut drop
    ip daddr @cut4 drop
    ip6 daddr @cut6 drop
  }
)";

constexpr size_t kRules = 7; // in both chains

// Adding first makes deleting right whether there was a table or not.
std::string RenderRemoval() {
  return std::string("add table ") + kTable + "\ndelete table " + kTable + "\n";
}

std::string RenderSet(const std::string &name, const std::string &type, const std::string &elements) {
  return "  set " + name + " { type " + type + (elements.empty() ? "" : " elements = {" + elements + "};") + " }\n";
}

void Append(std::string &elements, const std::string &element) {
  elements.append(elements.empty() ? "" : ", ").append(element);
}

} // namespace

std::string RenderTable(const MacSet &cut, const std::vector<std::string> &addresses) {
  std::string macs;
  std::string v4;
  std::string v6;
  for (const std::string &mac : cut) {
    Append(macs, mac);
  }
  for (const std::string &address : addresses) {
    Append(address.find(':') == std::string::npos ? v4 : v6, address);
  }
  return RenderRemoval() + "table " + kTable + " {\n" + RenderSet("cut", "ether_addr;", macs) +
         RenderSet("cut4", std::string("ipv4_addr;") + kAddressSet, v4) +
         RenderSet("cut6", std::string("ipv6_addr;") + kAddressSet, v6) + kChains + "}\n";
}

int LoadTable(const MacSet &cut) {
  return Nftables().Run(RenderTable(cut, AddressesOf(cut))) ? 0 : -1;
}

std::optional<MacSet> ReadTable() {
  Json::Value items;
  if (!Nftables().List(std::string("table ") + kTable, items)) {
    return {};
  }
  size_t rules = 0;
  std::optional<MacSet> cut;
  for (const Json::Value &item : items) {
    rules += item.isMember("rule") ? 1 : 0;
    if (item["set"]["name"] == "cut") {
      cut.emplace();
      for (const Json::Value &element : item["set"]["elem"]) {
        cut->insert(element.isString() ? element.asString() : "not loaded by this program");
      }
    }
  }
  return rules == kRules ? cut : std::nullopt;
}

int RemoveTable() {
  return Nftables().Run(RenderRemoval()) ? 0 : -1;
}

} // namespace vornhost
