#include "tests/host/network/home.h"

#include "host/network/dhcp_client.h"
#include "tests/host/network/shell.h"
#include "tests/host/network/system_log.h"

#include <json/reader.h>
#include <json/value.h>
#include <sched.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <filesystem>
#include <sstream>

namespace hosttest {

namespace {

namespace fs = std::filesystem;

template <typename List> void Print(std::ostream &out, List lines) {
  std::sort(lines.begin(), lines.end());
  for (const std::string &line : lines) {
    out << line << "\n";
  }
}

void End(int &process) {
  if (process > 0) {
    kill(process, SIGKILL);
    waitpid(process, nullptr, 0);
    process = 0;
  }
}

void Install(const std::string &from, const std::string &to, fs::perms mode) {
  fs::create_directories(fs::path(to).parent_path());
  fs::copy_file(from, to, fs::copy_options::overwrite_existing);
  fs::permissions(to, mode);
}

Json::Value ShellJson(const std::string &command) {
  Json::Value out;
  std::istringstream(Shell(command)) >> out;
  return out;
}

std::string Field(const Json::Value &object, const char *key) {
  return std::string(key) + "=" + object[key].asString();
}

void AddLink(const Json::Value &link, std::vector<std::string> &lines) {
  const std::string name = link["ifname"].asString();
  bool up = false;
  for (const Json::Value &flag : link["flags"]) {
    up = up || flag.asString() == "UP";
  }
  lines.push_back("link " + name + " " + link["linkinfo"]["info_kind"].asString() + " " + link["address"].asString() +
                  (up ? " up " : " down ") + Field(link, "master") + " " + Field(link, "inet6_addr_gen_mode"));
}

void AddAddresses(const Json::Value &link, std::vector<std::string> &lines) {
  const std::string name = link["ifname"].asString();
  for (const Json::Value &address : link["addr_info"]) {
    if (address["scope"] != "link") {
      lines.push_back("address " + name + " " + address["local"].asString() + "/" + address["prefixlen"].asString() +
                      " " + Field(address, "broadcast") + " " + Field(address, "scope"));
    }
  }
}

void AddRoute(const Json::Value &route, std::vector<std::string> &lines) {
  const std::string destination = route["dst"].asString();
  if (destination.rfind("fe80:", 0) == 0 || route["table"] == "local" || destination == "multicast") {
    return;
  }
  lines.push_back("route " + destination + " " + Field(route, "gateway") + " " + Field(route, "dev") + " " +
                  Field(route, "protocol") + " " + Field(route, "prefsrc") + " " + Field(route, "metric") + " " +
                  Field(route, "table"));
}

// As iproute2 sees it, so that the reading does not share the mistakes of what is tested.
std::vector<std::string> KernelLines() {
  std::vector<std::string> lines;
  for (const Json::Value &link : ShellJson("ip -j -d link")) {
    AddLink(link, lines);
  }
  for (const Json::Value &link : ShellJson("ip -j address")) {
    AddAddresses(link, lines);
  }
  for (const char *family : {"-4", "-6"}) {
    for (const Json::Value &route : ShellJson(std::string("ip -j ") + family + " route show table all")) {
      AddRoute(route, lines);
    }
  }
  return lines;
}

constexpr char kWires[] = R"(
ip link add eth0 address 02:00:5e:10:00:01 type veth peer name isp0 netns $P
for port in lan1 lan2 lan3 guest1; do ip link add $port type veth peer name $port netns $P; done
for port in isp0 lan1 lan2 lan3 guest1; do nsenter -t $P -n ip link set $port up; done
nsenter -t $P -n ip address add 203.0.113.1/24 dev isp0)";

} // namespace

std::string Picture() {
  std::ostringstream out;
  Print(out, KernelLines());
  for (const char *name : {"eth0", "br0", "lbr0"}) {
    if (vornhost::DhcpClient(name).IsRunning()) {
      out << "DHCP client on " << name << "\n";
    }
  }
  std::vector<std::string> settings; // the order of the keys and an empty one say nothing
  std::istringstream file(ReadFile(kWanFile));
  for (std::string line; std::getline(file, line);) {
    if (line != "BRIDGE=") {
      settings.push_back("ifcfg-eth0 " + line);
    }
  }
  Print(out, settings);
  out << Shell("grep -H ^bridge= /etc/hostapd/*.conf || true");
  out << (fs::exists(fs::symlink_status(kLock)) ? "locked" : "not locked") << "\n";
  return out.str();
}

int StartProgram(const std::vector<std::string> &arguments) {
  const pid_t process = fork();
  if (process == 0) {
    std::vector<char *> pointers;
    pointers.reserve(arguments.size() + 1);
    for (const std::string &argument : arguments) {
      pointers.push_back(const_cast<char *>(argument.c_str()));
    }
    pointers.push_back(nullptr);
    execv(pointers[0], pointers.data());
    _exit(127);
  }
  return process;
}

int WaitFor(int process) {
  int status = 0;
  waitpid(process, &status, 0);
  return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
}

void ReapDaemons() {
  while (waitpid(-1, nullptr, WNOHANG) > 0) {
  }
}

void Home::SetUpTestSuite() {
  static const bool opened = (OpenSystemLog(), true); // for all suites of a program
  static_cast<void>(opened);
  Install(VORN_TOPOLOGY_PROGRAM, kProgram, fs::perms{0755});
  Install(VORN_PROGRAMS_SOURCE "/udhcpc.script", "/usr/vorn/sbin/udhcpc.script", fs::perms{0755});
  Install(VORN_PROGRAMS_SOURCE "/base-firewall.nft", "/usr/vorn/share/base-firewall.nft", fs::perms{0644});
  fs::create_directories("/etc/sysconfig/network-scripts");
  fs::create_directories("/etc/hostapd");
  // Duplicate address detection would let every address of IPv6 come a second late.
  WriteFile("/proc/sys/net/ipv6/conf/default/accept_dad", "0");
}

void Home::SetUp() {
  RemoveLinks();
  provider_ = fork();
  if (provider_ == 0) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    _exit(unshare(CLONE_NEWNET) == 0 && pause() == 0 ? 0 : 1);
  }
  const std::string ours = Shell("readlink /proc/self/ns/net");
  const std::string theirs = "readlink /proc/" + std::to_string(provider_) + "/ns/net";
  ASSERT_TRUE(Eventually(5000, [&] { return Shell(theirs) != ours; }));
  Shell("P=" + std::to_string(provider_) + "; set -e; " + kWires);
  WriteFile(kWanFile, "# the way out\nDEVICE=eth0\nBOOTPROTO=dhcp\nSLAVE=no\n");
  WriteFile(kLanFile,
            "DEVICE=lbr0\nTYPE=Bridge\nIPADDR=192.168.1.1\nNETMASK=255.255.255.0\nPORTS=\"lan1 lan2 lan3\"\n");
  WriteFile(kGuestFile, "DEVICE=gbr0\nTYPE=Bridge\nIPADDR=192.168.2.1\nNETMASK=255.255.255.0\nPORTS=\"guest1\"\n");
  WriteFile(kAccessPointFile, "interface=wlan0\nbridge=lbr0\nctrl_interface=/run/hostapd\n# bridge=lbr0\nssid=home\n\n"
                              "bss=gwlan0\nbridge=gbr0\nbss=xwlan0\nbridge=lbr0\n");
  StartDhcpServer();
  TakeSystemLog();
  ASSERT_EQ(Run("start"), 0) << TakeSystemLog();
}

void Home::TearDown() {
  for (const char *name : {"eth0", "br0"}) {
    vornhost::DhcpClient(name).Stop();
  }
  StopDhcpServer();
  End(provider_);
  ReapDaemons();
  RemoveLinks();
  fs::remove_all(kLock);
}

int Home::Run(const std::string &arguments) {
  return Status(std::string(kProgram) + " " + arguments + " 2>/dev/null");
}

void Home::StartDhcpServer() {
  const std::string ready = "/run/dnsmasq.pid";
  fs::remove(ready);
  server_ = StartProgram({"/usr/bin/nsenter", "-t", std::to_string(provider_), "-n", "/usr/sbin/dnsmasq", "-k",
                          "--conf-file=/dev/null", "--user=root", "--no-resolv", "--no-hosts", "--interface=isp0",
                          "--bind-interfaces", "--except-interface=lo", "--dhcp-range=203.0.113.100,203.0.113.150,1h",
                          "--no-ping", "--dhcp-authoritative", "--dhcp-leasefile=/var/lib/misc.leases",
                          "--pid-file=" + ready, "--log-facility=/dev/null"});
  ASSERT_TRUE(Eventually(5000, [&] { return fs::exists(ready); }));
}

void Home::StopDhcpServer() {
  End(server_);
}

std::string Home::AtProvider(const std::string &command) const {
  return Shell("nsenter -t " + std::to_string(provider_) + " -n " + command);
}

} // namespace hosttest
