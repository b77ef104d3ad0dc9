// Reading one rule.
#include "host/network/ipv4.h"
#include "host/portforward/rule.h"
#include "host/utility/sz_hash.h"
#include "tests/host/portforward/records.h"

#include <gmock/gmock.h>

namespace {

using vornhost::Forward;
using vornhost::ParsePorts;
using vornhost::PortRange;
using vornhost::RuleFault;

std::variant<Forward, RuleFault> Parse(const hosttest::Pairs &pairs) {
  QARDCSzHash values(8);
  for (const auto &[key, value] : pairs) {
    values.Set(key, value);
  }
  return vornhost::ParseRule(values);
}

std::string FaultOf(const hosttest::Pairs &pairs) {
  const auto parsed = Parse(pairs);
  const auto *fault = std::get_if<RuleFault>(&parsed);
  return fault == nullptr ? "none" : fault->field + " '" + fault->value + "' " + fault->why;
}

TEST(ParsePorts, TakesOnePortOrARange) {
  EXPECT_EQ(ParsePorts("1"), (PortRange{1, 1}));
  EXPECT_EQ(ParsePorts("65535"), (PortRange{65535, 65535}));
  EXPECT_EQ(ParsePorts("5000-5010"), (PortRange{5000, 5010}));
  EXPECT_EQ(ParsePorts("1-65535"), (PortRange{1, 65535}));
  EXPECT_EQ(ParsePorts("80-80"), (PortRange{80, 80}));
}

TEST(ParsePorts, RefusesEverythingElse) {
  for (const char *text : {"",      "0",        "65536",   "99999999999999999999",
                           "-1",    "+80",      " 80",     "80 ",
                           "080",   "0x50",     "80.0",    "8 0",
                           "http",  "80-",      "-80",     "80-79",
                           "0-80",  "80-65536", "80--90",  "80-90-100",
                           "80,81", "80:90",    "80 - 90", "\xd9\xa3",
                           "80\n",  "-",        "1e3",     "٣"}) {
    EXPECT_EQ(ParsePorts(text), std::nullopt) << text;
  }
  EXPECT_EQ(ParsePorts(std::string_view("80\0", 3)), std::nullopt);
  EXPECT_EQ(ParsePorts(std::string(65536, '1')), std::nullopt);
}

TEST(PortText, IsWhatParsePortsTakes) {
  EXPECT_EQ(vornhost::PortText({80, 80}), "80");
  EXPECT_EQ(vornhost::PortText({80, 90}), "80-90");
}

TEST(ParseRule, TakesEachKindOfRule) {
  const auto one = std::get<Forward>(Parse(hosttest::Rule("8080", "tcp", "192.168.1.110", "80")));
  EXPECT_TRUE(one.tcp);
  EXPECT_FALSE(one.udp);
  EXPECT_EQ(one.target, 0xC0A8016EU);
  EXPECT_EQ(one.InnerPort(8080), 80);
  EXPECT_EQ(one.Describe("tcp"), "tcp 8080 -> 192.168.1.110:80");
  const auto range = std::get<Forward>(Parse(hosttest::Rule("5000-5010", "udp", "10.0.0.1", "6000-6010")));
  EXPECT_FALSE(range.tcp);
  EXPECT_TRUE(range.udp);
  EXPECT_EQ(range.InnerPort(5000), 6000);
  EXPECT_EQ(range.InnerPort(5010), 6010);
  const auto many = std::get<Forward>(Parse(hosttest::Rule("5000-5010", "both", "10.0.0.1", "80")));
  EXPECT_TRUE(many.tcp && many.udp);
  EXPECT_EQ(many.InnerPort(5010), 80);
}

TEST(ParseRule, ProtocolsLettersMayBeEither) {
  for (const char *protocol : {"tcp", "TCP", "Udp", "BOTH", "tcp/udp", "TCP/UDP"}) {
    EXPECT_EQ(FaultOf(hosttest::Rule("1", protocol, "10.0.0.1", "1")), "none") << protocol;
  }
}

TEST(ParseRule, NamesTheFieldAndTheFault) {
  EXPECT_EQ(FaultOf(hosttest::Rule("0", "tcp", "10.0.0.1", "80")),
            "sourcePort '0' no port from 1 to 65535 and no range of them");
  EXPECT_EQ(FaultOf(hosttest::Rule("80", "tcp", "10.0.0.1", "65536")),
            "targetPort '65536' no port from 1 to 65535 and no range of them");
  EXPECT_EQ(FaultOf(hosttest::Rule("100-50", "tcp", "10.0.0.1", "80")),
            "sourcePort '100-50' no port from 1 to 65535 and no range of them");
  EXPECT_EQ(FaultOf(hosttest::Rule("1", "tcp", "10.0.0.1", "2-3")),
            "targetPort '2-3' a range of another length than sourcePort's");
  EXPECT_EQ(FaultOf(hosttest::Rule("1-3", "tcp", "10.0.0.1", "2-3")),
            "targetPort '2-3' a range of another length than sourcePort's");
}

TEST(ParseRule, RefusesWhatIsNoProtocol) {
  for (const char *protocol : {"", "icmp", "tcp ", "tcpudp", "tc", "6", "any", "tcp\nudp"}) {
    EXPECT_EQ(FaultOf(hosttest::Rule("1", protocol, "10.0.0.1", "1")),
              std::string("protocol '") + protocol + "' not tcp, udp or both");
  }
}

TEST(ParseRule, RefusesWhatIsNoDottedAddress) {
  for (const char *address : {"", "010.0.0.1", "0x7f.1", "1.2.3", "::ffff:1.2.3.4", "fe80::1%lbr0", "10.0.0.1 ",
                              "10.0.0.256", "10.0.0.1/24", "laptop", "10.0.0.1\"", "10.0.0.1;drop"}) {
    EXPECT_EQ(FaultOf(hosttest::Rule("1", "tcp", address, "1")),
              std::string("targetIP '") + address + "' no IPv4 address");
  }
}

TEST(ParseRule, MissingFieldIsNamed) {
  EXPECT_EQ(FaultOf({}), "sourcePort '' missing");
  EXPECT_EQ(FaultOf({{"r_port", "1"}}), "protocol '' missing");
  EXPECT_EQ(FaultOf({{"r_port", "1"}, {"protocol name", "tcp"}}), "targetIP '' missing");
  EXPECT_EQ(FaultOf({{"r_port", "1"}, {"protocol name", "tcp"}, {"s_ip", "10.0.0.1"}}), "targetPort '' missing");
}

} // namespace
