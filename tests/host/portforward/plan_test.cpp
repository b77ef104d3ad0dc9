// What is made of the whole rule file and the DMZ file.
#include "host/network/ipv4.h"
#include "host/portforward/plan.h"
#include "tests/host/portforward/records.h"

#include <gmock/gmock.h>

#include <netinet/in.h>

namespace {

using hosttest::Rule;
using testing::ElementsAre;
using testing::IsEmpty;
using vornhost::Plan;
using State = vornhost::PlannedRule::State;

uint32_t Ip(const char *text) {
  return vornhost::ParseIpv4(text).value();
}

const vornhost::Surroundings kHome = {{{Ip("192.168.1.1"), 24}, {Ip("192.168.2.1"), 24}}, {8080}};

Plan PlanOf(const std::vector<hosttest::Pairs> &rules, const vornhost::DmzTexts &dmz = {},
            const vornhost::Surroundings &surroundings = kHome) {
  hosttest::Records records;
  for (const auto &rule : rules) {
    records.emplace_back(std::to_string(records.size()), rule);
  }
  return vornhost::MakePlan(hosttest::MakeList(records).get(), dmz, surroundings);
}

std::vector<std::string> LeftOut(const Plan &plan) {
  std::vector<std::string> out;
  for (const auto &rule : plan.rules) {
    if (rule.state == State::kLeftOut) {
      out.push_back(rule.name + " " + rule.why);
    }
  }
  return out;
}

std::string Where(const Plan &plan, int protocol, uint16_t port) {
  const auto target = plan.Find(protocol, port);
  return target ? vornhost::Ipv4Text(target->address) + ":" + std::to_string(target->port) : "router";
}

TEST(MakePlan, EmptyFileAndNoDmzForwardNothing) {
  const Plan plan = PlanOf({});
  EXPECT_THAT(plan.rules, IsEmpty());
  EXPECT_EQ(Where(plan, IPPROTO_TCP, 80), "router");
}

TEST(MakePlan, ValidRulesAreActiveInOrder) {
  const Plan plan = PlanOf({Rule("8081", "tcp", "192.168.1.110", "80"), Rule("8081", "udp", "192.168.1.111", "81"),
                            Rule("5000-5010", "both", "192.168.2.110", "6000-6010")});
  EXPECT_THAT(LeftOut(plan), IsEmpty());
  EXPECT_EQ(Where(plan, IPPROTO_TCP, 8081), "192.168.1.110:80");
  EXPECT_EQ(Where(plan, IPPROTO_UDP, 8081), "192.168.1.111:81");
  EXPECT_EQ(Where(plan, IPPROTO_TCP, 5003), "192.168.2.110:6003");
  EXPECT_EQ(Where(plan, IPPROTO_UDP, 5010), "192.168.2.110:6010");
  EXPECT_EQ(Where(plan, IPPROTO_TCP, 5011), "router");
  EXPECT_EQ(Where(plan, IPPROTO_SCTP, 8081), "router");
}

TEST(MakePlan, DisabledRuleIsNotJudgedAndTakesNoPort) {
  for (const char *enabled : {"0", "", "yes", "true"}) {
    const Plan plan = PlanOf({Rule("0", "x", "y", "z", enabled), Rule("81", "tcp", "192.168.1.110", "80", enabled),
                              Rule("81", "tcp", "192.168.1.111", "80")});
    EXPECT_EQ(plan.rules[0].state, State::kDisabled);
    EXPECT_EQ(plan.rules[1].state, State::kDisabled);
    EXPECT_EQ(Where(plan, IPPROTO_TCP, 81), "192.168.1.111:80");
  }
  EXPECT_EQ(PlanOf({{}}).rules[0].state, State::kDisabled);
}

TEST(MakePlan, InvalidRuleCostsNoOther) {
  const Plan plan = PlanOf({Rule("81", "tcp", "192.168.1.110", "80"),
                            Rule("0", "tcp", "192.168.1.110", "80", "1", "Web"),
                            {{"enabled", "1"}},
                            Rule("82", "tcp", "192.168.1.110", "80")});
  EXPECT_THAT(LeftOut(plan),
              ElementsAre("rule 1 \"Web\" sourcePort \"0\": no port from 1 to 65535 and no range of them",
                          "rule 2 \"\" sourcePort: missing"));
  EXPECT_EQ(Where(plan, IPPROTO_TCP, 81), "192.168.1.110:80");
  EXPECT_EQ(Where(plan, IPPROTO_TCP, 82), "192.168.1.110:80");
}

TEST(MakePlan, TargetMustBeALansDevice) {
  const std::pair<const char *, const char *> cases[] = {
      {"192.168.3.1", "in no LAN of this router"}, {"203.0.113.7", "in no LAN of this router"},
      {"127.0.0.1", "in no LAN of this router"},   {"192.168.1.1", "the router's own address"},
      {"192.168.2.1", "the router's own address"}, {"192.168.1.0", "no device's address"},
      {"192.168.1.255", "no device's address"}};
  for (const auto &[address, why] : cases) {
    const Plan plan = PlanOf({Rule("81", "tcp", address, "80")}, {"yes", address});
    EXPECT_THAT(LeftOut(plan), ElementsAre(std::string("rule 0 \"s\" targetIP \"") + address + "\": " + why));
    EXPECT_EQ(plan.dmzState, State::kLeftOut);
    EXPECT_EQ(plan.dmzWhy, std::string("ip \"") + address + "\": " + why);
    EXPECT_EQ(Where(plan, IPPROTO_TCP, 81), "router");
  }
}

TEST(MakePlan, WithoutALanNothingIsForwarded) {
  const Plan plan = PlanOf({Rule("81", "tcp", "192.168.1.110", "80")}, {"yes", "192.168.1.110"}, {{}, {8080}});
  EXPECT_THAT(LeftOut(plan), ElementsAre("rule 0 \"s\" targetIP \"192.168.1.110\": in no LAN of this router"));
  EXPECT_EQ(plan.dmzState, State::kLeftOut);
}

TEST(MakePlan, SmallestNetworksHaveNoAddressesOfTheirOwn) {
  const vornhost::Surroundings pair = {{{Ip("10.0.0.1"), 31}}, {}};
  EXPECT_THAT(LeftOut(PlanOf({Rule("1", "tcp", "10.0.0.0", "1")}, {}, pair)), IsEmpty());
  const vornhost::Surroundings all = {{{Ip("10.0.0.1"), 0}}, {}};
  EXPECT_THAT(LeftOut(PlanOf({Rule("1", "tcp", "203.0.113.1", "1")}, {}, all)), IsEmpty());
}

TEST(MakePlan, ManagementPortIsProtectedForTcpAlsoInsideARange) {
  const Plan plan =
      PlanOf({Rule("8080", "tcp", "192.168.1.110", "80"), Rule("8000-9000", "both", "192.168.1.110", "80"),
              Rule("8080", "udp", "192.168.1.110", "80"), Rule("81", "tcp", "192.168.1.110", "8080")});
  EXPECT_THAT(LeftOut(plan),
              ElementsAre("rule 0 \"s\" sourcePort \"8080\": has the router's management port 8080",
                          "rule 1 \"s\" sourcePort \"8000-9000\": has the router's management port 8080"));
}

TEST(MakePlan, PortOfAnEarlierRuleIsRefusedWithItsNameAndRange) {
  const Plan plan = PlanOf({Rule("100-200", "tcp", "192.168.1.110", "80", "1", "First"),
                            Rule("200-300", "tcp", "192.168.1.111", "80"),
                            Rule("50-100", "both", "192.168.1.111", "80"), Rule("150", "tcp", "192.168.1.111", "80"),
                            Rule("1-1000", "tcp", "192.168.1.111", "80"), Rule("100-200", "udp", "192.168.1.111", "80"),
                            Rule("201", "tcp", "192.168.1.111", "80"), Rule("99", "tcp", "192.168.1.111", "80")});
  EXPECT_THAT(LeftOut(plan), ElementsAre("rule 1 \"s\" sourcePort \"200-300\": rule 0 \"First\" has 100-200",
                                         "rule 2 \"s\" sourcePort \"50-100\": rule 0 \"First\" has 100-200",
                                         "rule 3 \"s\" sourcePort \"150\": rule 0 \"First\" has 100-200",
                                         "rule 4 \"s\" sourcePort \"1-1000\": rule 0 \"First\" has 100-200"));
  EXPECT_EQ(Where(plan, IPPROTO_UDP, 100), "192.168.1.111:80");
}

TEST(MakePlan, RuleThatIsLeftOutTakesNoPort) {
  const Plan plan =
      PlanOf({Rule("100-200", "both", "192.168.3.1", "80"), Rule("100-200", "both", "192.168.1.111", "80")});
  EXPECT_EQ(plan.rules[1].state, State::kActive);
}

TEST(MakePlan, BothTakesThePortOfBothProtocols) {
  const Plan plan = PlanOf({Rule("100", "both", "192.168.1.110", "80"), Rule("100", "udp", "192.168.1.111", "80"),
                            Rule("100", "tcp", "192.168.1.111", "80")});
  EXPECT_THAT(LeftOut(plan), ElementsAre("rule 1 \"s\" sourcePort \"100\": rule 0 \"s\" has 100",
                                         "rule 2 \"s\" sourcePort \"100\": rule 0 \"s\" has 100"));
}

TEST(MakePlan, ForeignTextsAreFitForALogLine) {
  const std::string evil = "a\nb\x1b[31m\"; drop\xff" + std::string(500, 'x');
  const Plan plan = PlanOf({Rule(evil.c_str(), "tcp", "192.168.1.110", "80", "1", evil.c_str())});
  for (const std::string &text : {plan.rules[0].name, plan.rules[0].why}) {
    EXPECT_LT(text.size(), 200U);
    EXPECT_TRUE(std::all_of(text.begin(), text.end(), [](char c) { return c >= ' ' && c <= '~'; })) << text;
  }
}

TEST(MakePlan, DmzGetsWhatIsLeftButTheRoutersOwn) {
  const Plan plan = PlanOf({Rule("81", "tcp", "192.168.1.110", "80")}, {"yes", "192.168.1.112"});
  EXPECT_EQ(plan.dmzState, State::kActive);
  EXPECT_EQ(Where(plan, IPPROTO_TCP, 81), "192.168.1.110:80");
  EXPECT_EQ(Where(plan, IPPROTO_UDP, 81), "192.168.1.112:81");
  EXPECT_EQ(Where(plan, IPPROTO_TCP, 22), "192.168.1.112:22");
  EXPECT_EQ(Where(plan, IPPROTO_GRE, 0), "192.168.1.112:0");
  EXPECT_EQ(Where(plan, IPPROTO_UDP, 8080), "192.168.1.112:8080");
  EXPECT_EQ(Where(plan, IPPROTO_TCP, 8080), "router");
  EXPECT_EQ(Where(plan, IPPROTO_UDP, 68), "router");
  EXPECT_EQ(Where(plan, IPPROTO_ICMP, 0), "router");
}

TEST(MakePlan, DmzIsOnOnlyForYes) {
  for (const char *text : {"", "no", "YES", "1", "true"}) {
    EXPECT_EQ(PlanOf({}, {text, "192.168.1.112"}).dmzState, State::kDisabled) << text;
  }
  const Plan plan = PlanOf({}, {"yes", ""});
  EXPECT_EQ(plan.dmzState, State::kLeftOut);
  EXPECT_EQ(plan.dmzWhy, "ip \"\": no IPv4 address");
}

} // namespace
