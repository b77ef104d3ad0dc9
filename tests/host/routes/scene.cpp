#include "tests/host/routes/scene.h"

#include "tests/host/files.h"
#include "tests/host/network/shell.h"
#include "tests/host/utility/syslog_record.h"

#include <json/reader.h>
#include <json/writer.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <memory>
#include <tuple>

namespace hosttest {

using vornnetwork::network::IP_TYPE;
using vornnetwork::network::StaticRoute;

namespace {

// The kernel says some things of a link that has come up later than "up" itself, from a thread of its own: the carrier,
// and the link-local and multicast routes, here of both ends of three pairs.
bool LinksAreSettled() {
  return Shell("{ ip -4 route show table all; ip -6 route show table all; } | grep linkdown | wc -l") == "0\n" &&
         Shell("ip -6 route show table all | grep -E '^(fe80::/64|multicast ff00::/8) ' | wc -l") == "12\n";
}

} // namespace

void RoutesTest::SetUp() {
  RemoveLinks();
  std::filesystem::remove_all("/etc/iproute2/config");
  std::filesystem::remove_all("/run/vorn");
  Shell("sysctl -qw net.ipv6.conf.all.accept_dad=0 net.ipv6.conf.default.accept_dad=0"); // addresses are there at once
  for (const auto &[name, four, six] :
       {std::tuple("lan0", "192.168.7.1/24", "fd00:7::1/64"), std::tuple("wan0", "10.9.0.2/24", "fd00:9::2/64"),
        std::tuple("wan1", "10.8.0.2/24", "fd00:8::2/64")}) {
    Shell(std::string("n=") + name + "; ip link add $n type veth peer name ${n}p && ip link set ${n}p up && " +
          "ip link set $n up && ip addr add " + four + " dev $n && ip addr add " + six + " nodad dev $n");
  }
  ASSERT_TRUE(Eventually(5000, LinksAreSettled)) << AllRoutes();
  TakeLogLines();
}

Json::Value Parse(const std::string &text) {
  Json::Value value;
  std::string errors;
  const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  EXPECT_TRUE(reader->parse(text.data(), text.data() + text.size(), &value, &errors)) << errors;
  return value;
}

std::string Text(const Json::Value &value) {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  return Json::writeString(builder, value);
}

namespace {

Json::Value Rule(const char *lengthField, const std::string &ip, const std::string &length, const std::string &gateway,
                 const std::string &ifname, bool enabled) {
  Json::Value rule;
  rule["ip"] = ip;
  rule[lengthField] = length;
  rule["gateway"] = gateway;
  rule["ifname"] = ifname;
  rule["enable"] = enabled;
  return rule;
}

} // namespace

Json::Value Rule4(const std::string &ip, const std::string &mask, const std::string &gateway, const std::string &ifname,
                  bool enabled) {
  return Rule("mask", ip, mask, gateway, ifname, enabled);
}

Json::Value Rule6(const std::string &ip, const std::string &length, const std::string &gateway,
                  const std::string &ifname, bool enabled) {
  return Rule("prefix_length", ip, length, gateway, ifname, enabled);
}

Json::Value ManyRules(unsigned count, const std::string &gateway) {
  Json::Value rules(Json::arrayValue);
  for (unsigned i = 0; i < count; ++i) {
    const std::string ip = "10." + std::to_string(128 + i / 256) + "." + std::to_string(i % 256) + ".0";
    rules.append(Rule4(ip, "255.255.255.0", gateway));
  }
  return rules;
}

int SetRules(const Json::Value &rules, IP_TYPE type) {
  return StaticRoute().SetRules(type, rules);
}

Json::Value GetRules(IP_TYPE type) {
  Json::Value rules;
  EXPECT_EQ(StaticRoute().GetRules(type, rules), 0);
  return rules;
}

std::string OwnRoutes(const char *family) {
  return Shell(std::string("ip ") + family + " route show table main proto 86 | sed 's/ *$//' | sort");
}

std::string AllRoutes() {
  return Shell("ip -4 route show table all | sort; ip -6 route show table all | sed 's/ expires [^ ]*//' | sort");
}

std::string Everything() {
  return AllRoutes() + ReadText("/etc/iproute2/config/static-route") + ReadText("/etc/iproute2/config/static-route-v6");
}

Child::Child(const std::function<void()> &work) : pid_(fork()) {
  if (pid_ == 0) {
    work();
    _exit(0);
  }
}

void Child::Kill() {
  if (pid_ > 0) {
    kill(pid_, SIGKILL);
    waitpid(pid_, nullptr, 0);
    pid_ = -1;
  }
}

} // namespace hosttest
