// The table's text, whole.
#include "host/network/ipv4.h"
#include "host/portforward/table_text.h"
#include "tests/host/portforward/records.h"

#include <gmock/gmock.h>

#include <netinet/in.h>

namespace {

using hosttest::Rule;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using vornhost::Plan;

uint32_t Ip(const char *text) {
  return vornhost::ParseIpv4(text).value();
}

Plan PlanOf(const hosttest::Records &records, const vornhost::DmzTexts &dmz,
            const vornhost::Surroundings &surroundings) {
  return vornhost::MakePlan(hosttest::MakeList(records).get(), dmz, surroundings);
}

// What follows the frame: the part that depends on the plan.
std::string Rules(const Plan &plan) {
  const std::string text = vornhost::RenderTable(plan);
  const std::string flush = "flush table ip vorn_dnat\n";
  const size_t at = text.find(flush);
  EXPECT_NE(at, std::string::npos);
  return text.substr(at + flush.size());
}

const std::string kCutRules = R"(  chain cut_off {
    update @cut { ip saddr . meta l4proto . th sport . ip daddr . th dport }
    meta l4proto tcp reject with tcp reset
    drop
  }
  chain forward {
    ct direction original meta l4proto { tcp, udp } ip saddr . meta l4proto . th sport . ip daddr . th dport @cut goto cut_off
  }
)";

const vornhost::Surroundings kHome = {{{Ip("192.168.1.1"), 24}, {Ip("192.168.2.1"), 25}}, {8080, 443}};

TEST(TableText, HoldsEachKindOfForwardAndTheDmz) {
  const Plan plan = PlanOf({{"7", Rule("81", "tcp", "192.168.1.110", "80")},
                            {"8", Rule("90", "tcp", "192.168.1.110", "90", "0")},
                            {"9", Rule("5000-5002", "both", "192.168.1.111", "5000-5002")},
                            {"x", Rule("6000-6002", "udp", "192.168.1.111", "7000-7002")},
                            {"y", Rule("0", "udp", "192.168.1.111", "1")},
                            {"z", Rule("6000-6002", "tcp", "192.168.1.111", "80")}},
                           {"yes", "192.168.1.112"}, kHome);
  EXPECT_EQ(Rules(plan), R"(table ip vorn_dnat {
  chain tcp_forwards {
    tcp dport 81 dnat to 192.168.1.110:80 comment "rule 0 tcp 81 -> 192.168.1.110:80"
    tcp dport 5000-5002 dnat to 192.168.1.111 comment "rule 2 tcp 5000-5002 -> 192.168.1.111:5000-5002"
    tcp dport 6000-6002 dnat to 192.168.1.111:80 comment "rule 5 tcp 6000-6002 -> 192.168.1.111:80"
  }
  chain udp_forwards {
    udp dport 5000-5002 dnat to 192.168.1.111 comment "rule 2 udp 5000-5002 -> 192.168.1.111:5000-5002"
    udp dport 6000-6002 dnat to 192.168.1.111 : udp dport map { 6000 : 7000, 6001 : 7001, 6002 : 7002 } comment "rule 3 udp 6000-6002 -> 192.168.1.111:7000-7002"
  }
  chain inbound {
    meta l4proto vmap { tcp : jump tcp_forwards, udp : jump udp_forwards }
    tcp dport { 8080, 443 } return
    udp dport 68 return
    meta l4proto != icmp dnat to 192.168.1.112 comment "DMZ 192.168.1.112"
  }
)" + kCutRules + R"(  chain prerouting {
    fib daddr type local ip daddr != { 127.0.0.0/8, 192.168.1.1, 192.168.2.1 } goto inbound
  }
  chain postrouting {
    ip saddr 192.168.1.0/24 ip daddr 192.168.1.0/24 ct status dnat masquerade
    ip saddr 192.168.2.0/25 ip daddr 192.168.2.0/25 ct status dnat masquerade
  }
}
)");
  EXPECT_THAT(vornhost::RuleComments(plan), ElementsAre("DMZ 192.168.1.112", "rule 0 tcp 81 -> 192.168.1.110:80",
                                                        "rule 2 tcp 5000-5002 -> 192.168.1.111:5000-5002",
                                                        "rule 2 udp 5000-5002 -> 192.168.1.111:5000-5002",
                                                        "rule 3 udp 6000-6002 -> 192.168.1.111:7000-7002",
                                                        "rule 5 tcp 6000-6002 -> 192.168.1.111:80"));
}

TEST(TableText, WithoutALanNothingIsHooked) {
  const Plan plan = PlanOf({}, {}, {});
  EXPECT_EQ(Rules(plan), R"(table ip vorn_dnat {
  chain tcp_forwards {
  }
  chain udp_forwards {
  }
  chain inbound {
    meta l4proto vmap { tcp : jump tcp_forwards, udp : jump udp_forwards }
  }
)" + kCutRules + "}\n");
  EXPECT_THAT(vornhost::RuleComments(plan), IsEmpty());
}

TEST(TableText, NothingOfAForeignTextGetsIn) {
  const Plan plan = PlanOf({{"evil\" name", Rule("81", "tcp", "192.168.1.110", "80", "1", "\"\n}; flush ruleset")},
                            {"\n", Rule("82", "tcp", "192.168.1.110\n", "80")}},
                           {"yes", "192.168.1.112; x"}, kHome);
  const std::string text = vornhost::RenderTable(plan);
  EXPECT_THAT(text, HasSubstr("tcp dport 81 dnat"));
  for (const char *foreign : {"evil", "ruleset", "82", "112"}) {
    EXPECT_THAT(text, Not(HasSubstr(foreign)));
  }
}

TEST(TableText, CutsNameTheHostsSideOfAConnection) {
  EXPECT_EQ(vornhost::RenderCuts({{Ip("192.168.1.110"), IPPROTO_TCP, 80, Ip("203.0.113.1"), 40000},
                                  {Ip("192.168.1.111"), IPPROTO_UDP, 5000, Ip("203.0.113.1"), 5001}}),
            "add element ip vorn_dnat cut { 192.168.1.110 . tcp . 80 . 203.0.113.1 . 40000, "
            "192.168.1.111 . udp . 5000 . 203.0.113.1 . 5001 }\n");
}

} // namespace
