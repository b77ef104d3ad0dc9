#include "host/network/topology.h"

#include "host/network/current_topology.h"
#include "host/network/names.h"
#include "host/network/topology_config.h"
#include "host/wireless/upstream.h"

#include <sys/stat.h>

#include <map>
#include <ostream>

namespace vornhost {

namespace {

void ShowLink(std::ostream &out, const Link &link, const std::string &master, const std::vector<Address> &addresses) {
  out << "  " << link.name << (link.up ? " up" : " down");
  if (!master.empty()) {
    out << ", port of " << master;
  }
  for (const Address &address : addresses) {
    if (address.index == link.index) {
      out << ", " << address.text;
    }
  }
  out << "\n";
}

// Only looked at: whether it is held is for those who mean to change something.
const char *LockText() {
  struct stat info {};
  if (lstat(kTopologyLock, &info) != 0) {
    return "no switch is under way";
  }
  return "there is a lock: a switch is under way or died";
}

} // namespace

Result ShowStatus(std::ostream &out) {
  const char *topology = CurrentTopology();
  out << "topology:   " << (topology != nullptr ? topology : "none") << "\n";
  out << "configured: " << ConfiguredTopology() << "\n";
  std::string why;
  const std::string upstream = FindUpstream(why);
  out << "upstream:   " << (upstream.empty() ? "none: " + why : upstream) << "\n";
  out << "lock:       " << LockText() << "\n";
  Netlink netlink;
  const std::vector<Link> links = netlink.Links();
  const std::vector<Address> addresses = netlink.Addresses();
  std::map<int, std::string> names = {{0, ""}};
  for (const Link &link : links) {
    names[link.index] = link.name;
  }
  out << "links:\n";
  for (const Link &link : links) {
    ShowLink(out, link, names[link.master], addresses);
  }
  return Result::kDone;
}

} // namespace vornhost
