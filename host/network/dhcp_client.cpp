#include "host/network/dhcp_client.h"

#include "host/network/names.h"
#include "host/network/netlink.h"
#include "host/utility/program_runner.h"
#include "host/utility/unique_fd.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <climits>
#include <fstream>
#include <optional>
#include <stdexcept>

namespace vornhost {

namespace {

std::string RunFile(const std::string &interface, const char *kind) {
  return std::string(kRunFolder) + "/udhcpc." + interface + kind;
}

std::string HostName() {
  std::array<char, HOST_NAME_MAX + 1> name{};
  gethostname(name.data(), name.size() - 1);
  return name.data();
}

} // namespace

DhcpClient::DhcpClient(const std::string &interface)
    : interface_(interface), process_("udhcpc", "-p", RunFile(interface, ".pid")) {}

std::string DhcpClient::KeepFile() const {
  return RunFile(interface_, ".keep");
}

void DhcpClient::Run(const std::vector<std::string> &options) const {
  Stop(); // two clients on one interface would undo each other's work
  std::vector<std::string> arguments = {kDhcpClientProgram,    "-i", interface_,        "-p",
                                        process_.GetPidFile(), "-s", kDhcpClientScript, "-S"};
  const std::string host = HostName();
  if (!host.empty() && host != "(none)") {
    arguments.insert(arguments.end(), {"-x", "hostname:" + host});
  }
  arguments.insert(arguments.end(), options.begin(), options.end());
  RunLimits limits;
  limits.time = std::chrono::seconds(15);
  mkdir(kRunFolder, 0700);
  if (ProgramRunner(limits).Run(arguments) != 0) {
    Stop(); // one that was cut off at the limit may have left a child
    throw std::runtime_error("no DHCP lease on " + interface_);
  }
  process_.AwaitBackground();
}

// -t tries, -T seconds apart; -n: end without a lease, -b: go on in the background and try again every -A seconds.
void DhcpClient::StartWithLease() const {
  unlink(KeepFile().c_str());
  Run({"-n", "-t", "10", "-T", "1", "-A", "5"});
}

void DhcpClient::Start() const {
  unlink(KeepFile().c_str());
  Run({"-b", "-t", "1", "-T", "1", "-A", "5"});
}

void DhcpClient::Resume(const std::string &address) const {
  if (address.empty()) {
    Start();
    return;
  }
  mkdir(kRunFolder, 0700);
  const UniqueFd keep(open(KeepFile().c_str(), O_CREAT | O_WRONLY | O_CLOEXEC | O_NOFOLLOW, 0644));
  Run({"-b", "-t", "1", "-T", "1", "-A", "5", "-r", address});
}

void DhcpClient::ResumeLease() const {
  std::string leased; // as udhcpc.script has written it, "192.0.2.7/24"
  std::getline(std::ifstream(RunFile(interface_, ".address")), leased);
  Netlink netlink;
  const std::optional<Link> link = netlink.FindLink(interface_);
  const std::vector<Address> addresses = netlink.Addresses();
  const auto found = std::find_if(addresses.begin(), addresses.end(), [&](const Address &address) {
    return link && address.index == link->index && address.text == leased;
  });
  found != addresses.end() ? Resume(found->Host()) : Start();
}

} // namespace vornhost
