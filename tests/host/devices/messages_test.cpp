// What devices say of themselves on the wire.
#include "tests/host/devices/packets.h"

#include "host/devices/all_nodes.h"
#include "host/devices/dns_message.h"
#include "host/devices/neighbours.h"
#include "host/devices/node_status.h"
#include "host/devices/ssdp.h"
#include "host/devices/wifi_stations.h"

#include <gmock/gmock.h>
#include <linux/neighbour.h>
#include <linux/rtnetlink.h>
#include <sys/socket.h>

#include <cstring>

namespace {

using hosttest::DnsAnswer;
using hosttest::DnsName;
using hosttest::DnsRecord;
using hosttest::Number;
using testing::IsEmpty;
using vornhost::Finding;
using vornhost::ParseAnswer;

constexpr uint32_t kPrinter = 0xc0a8016f; // 192.168.1.111
const std::string kPrinterBytes = "\xc0\xa8\x01\x6f";
const std::string kService = DnsName({"_ipp", "_tcp", "local"});
const std::string kInstance = DnsName({"Brother HL-L2350DW series", "_ipp", "_tcp", "local"});
const std::string kHost = DnsName({"BRW3C2AF4112244", "local"});

std::string Txt(const std::vector<std::string> &strings) {
  std::string data;
  for (const std::string &each : strings) {
    data += static_cast<char>(each.size());
    data += each;
  }
  return data;
}

std::string PrinterAnswer() {
  return DnsAnswer({DnsRecord(kService, 12, kInstance),
                    DnsRecord(kInstance, 33, std::string(4, '\0') + Number(631) + kHost),
                    DnsRecord(kInstance, 16, Txt({"txtvers=1", "usb_MDL=HL-L2350DW", "ty=Brother HL-L2350DW series"})),
                    DnsRecord(kHost, 1, kPrinterBytes)});
}

TEST(MulticastDns, APrinterSaysNameKindAndModel) {
  EXPECT_EQ(ParseAnswer(PrinterAnswer(), kPrinter),
            (Finding{"BRW3C2AF4112244", "Printer", "Brother HL-L2350DW series"}));
}

TEST(MulticastDns, TheNameOfAnAddressIsTakenFromItsHostAlone) {
  const std::string reverse = DnsName({"111", "1", "168", "192", "in-addr", "arpa"});
  const std::string message = DnsAnswer({DnsRecord(reverse, 12, kHost)});
  EXPECT_EQ(ParseAnswer(message, kPrinter).name, "BRW3C2AF4112244");
  EXPECT_EQ(ParseAnswer(message, kPrinter + 1).name, "");
  EXPECT_EQ(ParseAnswer(PrinterAnswer(), kPrinter + 1).name, "");
}

TEST(MulticastDns, CompressedNamesAreFollowed) {
  // The host's name stands at 12; the address's record points there.
  const std::string message = DnsAnswer({DnsRecord(kHost, 47, ""), DnsRecord("\xc0\x0c", 1, kPrinterBytes)});
  EXPECT_EQ(ParseAnswer(message, kPrinter).name, "BRW3C2AF4112244");
}

TEST(MulticastDns, PointersThatGoRoundOrForwardEndTheMessage) {
  EXPECT_TRUE(ParseAnswer(DnsAnswer({DnsRecord("\xc0\x0c", 1, kPrinterBytes)}), kPrinter).IsEmpty());
  EXPECT_TRUE(ParseAnswer(DnsAnswer({DnsRecord("\xc0\x40", 1, kPrinterBytes)}), kPrinter).IsEmpty());
  EXPECT_TRUE(ParseAnswer(DnsAnswer({DnsRecord("\xff\xff", 1, kPrinterBytes)}), kPrinter).IsEmpty());
  const std::string forward = DnsAnswer({DnsRecord("\xc0\x1c", 1, kPrinterBytes), DnsRecord(kHost, 47, "")});
  EXPECT_TRUE(ParseAnswer(forward, kPrinter).IsEmpty());
}

TEST(MulticastDns, EveryCutIsSurvivedAndKeepsWhatCameBefore) {
  const std::string whole = PrinterAnswer();
  for (size_t size = 0; size < whole.size(); ++size) {
    EXPECT_EQ(ParseAnswer(whole.substr(0, size), kPrinter).name, "") << size; // it stands last
  }
  EXPECT_EQ(ParseAnswer(whole.substr(0, whole.size() - 1), kPrinter).type, "Printer");
}

TEST(MulticastDns, QuestionsSayNothing) {
  std::string question = PrinterAnswer();
  question[2] = '\0';
  EXPECT_TRUE(ParseAnswer(question, kPrinter).IsEmpty());
  EXPECT_TRUE(ParseAnswer(vornhost::ServiceQuestion(), kPrinter).IsEmpty());
}

TEST(MulticastDns, HostileNamesAreCleaned) {
  const std::string host = DnsName({"<b>\x1b\xff$(id)", "local"});
  EXPECT_EQ(ParseAnswer(DnsAnswer({DnsRecord(host, 1, kPrinterBytes)}), kPrinter).name, "<b>$(id)");
  const std::string none = DnsName({"localhost"});
  EXPECT_EQ(ParseAnswer(DnsAnswer({DnsRecord(none, 1, kPrinterBytes)}), kPrinter).name, "");
}

TEST(MulticastDns, WhatADeviceIsComesBeforeWhatItCanDo) {
  const auto service = [](const char *name) { return DnsRecord(DnsName({name, "_tcp", "local"}), 12, DnsName({"x"})); };
  EXPECT_EQ(ParseAnswer(DnsAnswer({service("_workstation"), service("_ipp")}), kPrinter).type, "Printer");
  EXPECT_EQ(ParseAnswer(DnsAnswer({service("_workstation"), service("_afpovertcp")}), kPrinter).type, "nas");
  EXPECT_EQ(ParseAnswer(DnsAnswer({service("_unknown")}), kPrinter).type, "");
  EXPECT_EQ(ParseAnswer(DnsAnswer({service("my_ipp")}), kPrinter).type, "");
}

TEST(MulticastDns, QuestionsAreWellFormed) {
  EXPECT_EQ(vornhost::ReverseQuestion({kPrinter}), std::string("\0\0\0\0\0\1\0\0\0\0\0\0", 12) +
                                                       DnsName({"111", "1", "168", "192", "in-addr", "arpa"}) +
                                                       Number(12) + Number(1));
  EXPECT_LT(vornhost::ServiceQuestion().size(), 512U);
}

TEST(NodeStatus, TheHostsOwnActiveNameCounts) {
  const std::string message = hosttest::NodeStatus(
      7, {{"HOME", 0, true}, {"OLD", 0, false, false}, {"SERVER", 0x20}, {"GROUPWARE PC", 0}, {"SECOND", 0}});
  EXPECT_EQ(vornhost::ParseNodeStatus(message, 7), "GROUPWARE PC");
  EXPECT_EQ(vornhost::ParseNodeStatus(message, 8), "");
}

TEST(NodeStatus, AFileServersNameIsBetterThanNone) {
  EXPECT_EQ(vornhost::ParseNodeStatus(hosttest::NodeStatus(7, {{"MSGR", 3}, {"SERVER", 0x20}}), 7), "SERVER");
  EXPECT_EQ(vornhost::ParseNodeStatus(hosttest::NodeStatus(7, {}), 7), "");
}

TEST(NodeStatus, HostileNamesAreCleaned) {
  EXPECT_EQ(vornhost::ParseNodeStatus(hosttest::NodeStatus(7, {{"\x1b$(id)\xff<b>", 0}}), 7), "$(id)<b>");
  EXPECT_EQ(vornhost::ParseNodeStatus(hosttest::NodeStatus(7, {{"*", 0}}), 7), "");
}

TEST(NodeStatus, EveryCutIsSurvived) {
  const std::string whole = hosttest::NodeStatus(7, {{"LAPTOP", 0}});
  const size_t entryEnd = whole.size() - 46;
  for (size_t size = 0; size <= whole.size(); ++size) {
    EXPECT_EQ(vornhost::ParseNodeStatus(whole.substr(0, size), 7), size < entryEnd ? "" : "LAPTOP") << size;
  }
}

TEST(NodeStatus, TheRequestIsAsTheProtocolSays) {
  EXPECT_EQ(vornhost::NodeStatusRequest(0x1234), std::string("\x12\x34\0\0\0\1\0\0\0\0\0\0", 12) + " CK" +
                                                     std::string(30, 'A') + std::string("\0\0\x21\0\1", 5));
}

const std::string kReply = "HTTP/1.1 200 OK\r\nST: upnp:rootdevice\r\nlocation:  ";

TEST(Ssdp, ALocationOnTheSendersHostCounts) {
  EXPECT_EQ(vornhost::ParseLocation(kReply + "http://192.168.1.113:8200/rootDesc.xml\r\n\r\n", "192.168.1.113"),
            "http://192.168.1.113:8200/rootDesc.xml");
  EXPECT_EQ(vornhost::ParseLocation("NOTIFY * HTTP/1.1\r\nLOCATION: http://192.168.1.113/\r\n\r\n", "192.168.1.113"),
            "http://192.168.1.113/");
}

TEST(Ssdp, NobodyElsesDoes) {
  for (const char *url : {"http://192.168.1.1:80/", "http://192.168.1.1130/", "http://192.168.1.113.evil.test/",
                          "http://192.168.1.113@evil/", "http://192.168.1.113:80@evil/", "http://192.168.1.113:/",
                          "http://192.168.1.113:123456/", "https://192.168.1.113/", "file:///etc/passwd",
                          "http://192.168.1.113", "http://192.168.1.113/a b", "http://192.168.1.113/\x01", ""}) {
    EXPECT_EQ(vornhost::ParseLocation(kReply + url + "\r\n\r\n", "192.168.1.113"), std::nullopt) << url;
  }
  EXPECT_EQ(vornhost::ParseLocation("M-SEARCH * HTTP/1.1\r\nLOCATION: http://192.168.1.113/\r\n\r\n", "192.168.1.113"),
            std::nullopt);
  const std::string lengthy = "http://192.168.1.113/" + std::string(600, 'a');
  EXPECT_EQ(vornhost::ParseLocation(kReply + lengthy + "\r\n", "192.168.1.113"), std::nullopt);
}

TEST(Ssdp, ADescriptionSaysNameKindAndModel) {
  const Finding finding = vornhost::ParseDescription(
      "<root><device><deviceType>urn:schemas-upnp-org:device:MediaServer:1</deviceType>"
      "<friendlyName>Anna &amp; Ben&apos;s &lt;b&gt;</friendlyName><modelName>Media\nPlayer</modelName>"
      "<deviceList><device><friendlyName>inner</friendlyName></device></deviceList></device></root>");
  EXPECT_EQ(finding, (Finding{"Anna & Ben's <b>", "Media Server", "MediaPlayer"}));
}

TEST(Ssdp, BrokenDescriptionsSayNothing) {
  for (const char *xml :
       {"", "<friendlyName>", "<friendlyName>x", "<friendlyName>x<b>y</b></friendlyName>", "friendlyName"}) {
    EXPECT_TRUE(vornhost::ParseDescription(xml).IsEmpty()) << xml;
  }
}

// ---- neighbours

std::string Attribute(unsigned short type, const std::string &data) {
  rtattr header{};
  header.rta_len = static_cast<unsigned short>(sizeof(header) + data.size());
  header.rta_type = type;
  std::string bytes(reinterpret_cast<const char *>(&header), sizeof(header));
  bytes += data;
  bytes.resize(RTA_ALIGN(bytes.size()));
  return bytes;
}

std::string NeighbourMessage(int family, uint16_t state, int index, const std::string &address,
                             const std::string &mac) {
  ndmsg body{};
  body.ndm_family = static_cast<unsigned char>(family);
  body.ndm_state = state;
  body.ndm_ifindex = index;
  nda_cacheinfo age{};
  age.ndm_confirmed = 250;
  age.ndm_updated = 300;
  std::string content(reinterpret_cast<const char *>(&body), sizeof(body));
  content += Attribute(NDA_DST, address) + Attribute(NDA_LLADDR, mac) +
             Attribute(NDA_CACHEINFO, std::string(reinterpret_cast<const char *>(&age), sizeof(age)));
  nlmsghdr header{};
  header.nlmsg_type = RTM_NEWNEIGH;
  header.nlmsg_len = static_cast<uint32_t>(sizeof(header) + content.size());
  return std::string(reinterpret_cast<const char *>(&header), sizeof(header)) + content;
}

const std::string kMac = "\xd4\x3d\x7e\x11\x22\x33";
const std::string kGlobal6 = std::string("\x20\x01\x0d\xb8", 4) + std::string(11, '\0') + "\x01";
const std::string kLink6 = std::string("\xfe\x80", 2) + std::string(13, '\0') + "\x01";

std::vector<vornhost::DeviceNeighbour> Parse(const std::string &messages) {
  std::vector<vornhost::DeviceNeighbour> out;
  vornhost::ParseNeighbours(messages, {{3, "lbr0", "", {}, {}}}, out);
  return out;
}

TEST(Neighbours, BothFamiliesAreRead) {
  const auto found = Parse(NeighbourMessage(AF_INET, NUD_REACHABLE, 3, "\xc0\xa8\x01\x6e", kMac) +
                           NeighbourMessage(AF_INET6, NUD_STALE, 3, kGlobal6, kMac) +
                           NeighbourMessage(AF_INET6, NUD_REACHABLE, 3, kLink6, kMac));
  ASSERT_EQ(found.size(), 3U);
  EXPECT_EQ(found[0].address, "192.168.1.110");
  EXPECT_EQ(found[0].mac, "d4:3d:7e:11:22:33");
  EXPECT_EQ(found[0].netif, "lbr0");
  EXPECT_TRUE(found[0].reachable);
  EXPECT_EQ(found[0].confirmedAgo, 2500);
  EXPECT_EQ(found[0].updatedAgo, 3000);
  EXPECT_EQ(found[1].address, "2001:db8::1");
  EXPECT_FALSE(found[1].reachable);
  EXPECT_FALSE(found[1].linkLocal);
  EXPECT_TRUE(found[2].linkLocal);
}

TEST(Neighbours, EntriesThatAreNoDevicesArePassedOver) {
  EXPECT_THAT(Parse(NeighbourMessage(AF_INET, NUD_FAILED, 3, "\xc0\xa8\x01\x6e", kMac)), IsEmpty());
  EXPECT_THAT(Parse(NeighbourMessage(AF_INET, NUD_INCOMPLETE, 3, "\xc0\xa8\x01\x6e", kMac)), IsEmpty());
  EXPECT_THAT(Parse(NeighbourMessage(AF_INET, NUD_PERMANENT, 3, "\xc0\xa8\x01\x6e", kMac)), IsEmpty());
  EXPECT_THAT(Parse(NeighbourMessage(AF_INET, NUD_REACHABLE, 4, "\xc0\xa8\x01\x6e", kMac)), IsEmpty());
  EXPECT_THAT(Parse(NeighbourMessage(AF_INET, NUD_REACHABLE, 3, "\xc0\xa8\x01", kMac)), IsEmpty());
  EXPECT_THAT(Parse(NeighbourMessage(AF_INET, NUD_REACHABLE, 3, "\xc0\xa8\x01\x6e", "\x01\x01")), IsEmpty());
  EXPECT_THAT(Parse(NeighbourMessage(AF_BRIDGE, NUD_REACHABLE, 3, "\xc0\xa8\x01\x6e", kMac)), IsEmpty());
}

TEST(Neighbours, EveryCutIsSurvived) {
  const std::string whole = NeighbourMessage(AF_INET, NUD_REACHABLE, 3, "\xc0\xa8\x01\x6e", kMac);
  for (size_t size = 0; size < whole.size(); ++size) {
    EXPECT_THAT(Parse(whole.substr(0, size)), IsEmpty()) << size;
  }
}

// The bridge has 2001:db8:2::1/64.
vornhost::Bridge LanBridge(int prefix = 64) {
  return {3, "lbr0", "", {}, {{{0x20, 0x01, 0x0d, 0xb8, 0, 2, 0, 0, 0, 0, 0, 0, 0, 0, 0, 1}, prefix}}};
}

std::vector<vornhost::DeviceNeighbour> ParseOn(const vornhost::Bridge &bridge, const std::string &messages) {
  std::vector<vornhost::DeviceNeighbour> out;
  vornhost::ParseNeighbours(messages, {bridge}, out);
  return out;
}

TEST(Neighbours, AnAddressOfTheLinkLeadsToOneOfTheHome) {
  const std::string link = std::string("\xfe\x80", 2) + std::string(6, '\0') + "\x02\x11\x22\xff\xfe\x33\x44\x55";
  const std::string message = NeighbourMessage(AF_INET6, NUD_STALE, 3, link, kMac);
  EXPECT_EQ(ParseOn(LanBridge(), message)[0].guess, "2001:db8:2:0:211:22ff:fe33:4455");
  EXPECT_EQ(ParseOn(LanBridge(56), message)[0].guess, "");
  EXPECT_EQ(Parse(message)[0].guess, "");
  EXPECT_EQ(ParseOn(LanBridge(), NeighbourMessage(AF_INET6, NUD_STALE, 3, kGlobal6, kMac))[0].guess, "");
}

TEST(Neighbours, TheRouterItselfIsNone) {
  vornhost::Bridge bridge = LanBridge();
  bridge.mac = "d4:3d:7e:11:22:33";
  EXPECT_THAT(ParseOn(bridge, NeighbourMessage(AF_INET6, NUD_STALE, 3, kLink6, kMac)), IsEmpty());
}

// ---- answers to an echo request

std::string EchoReply(const std::string &source, unsigned id, char type = '\x81', char next = 58) {
  return std::string("\x60\0\0\0\0\x08", 6) + next + '\x40' + source + kGlobal6 + type + std::string(3, '\0') +
         Number(id) + Number(0);
}

const std::string kSensor = std::string("\x20\x01\x0d\xb8\0\x02", 6) + std::string(9, '\0') + "\x07";

TEST(EchoAnswers, TheSenderIsTaken) {
  EXPECT_EQ(vornhost::EchoSender(EchoReply(kSensor, 77), 77, LanBridge()), "2001:db8:2::7");
}

TEST(EchoAnswers, OfAnotherNetworkOrOfTheLinkAreNone) {
  EXPECT_EQ(vornhost::EchoSender(EchoReply(kGlobal6, 77), 77, LanBridge()), "");
  EXPECT_EQ(vornhost::EchoSender(EchoReply(kGlobal6, 77), 77, LanBridge(40)), "2001:db8::1");
  EXPECT_EQ(vornhost::EchoSender(EchoReply(kSensor, 77), 77, LanBridge(128)), "");
  EXPECT_EQ(vornhost::EchoSender(EchoReply(kLink6, 77), 77, LanBridge()), "");
}

TEST(EchoAnswers, ToNobodysQuestionOrOfAnotherKindAreNone) {
  EXPECT_EQ(vornhost::EchoSender(EchoReply(kSensor, 78), 77, LanBridge()), "");
  EXPECT_EQ(vornhost::EchoSender(EchoReply(kSensor, 77, '\x80'), 77, LanBridge()), "");
  EXPECT_EQ(vornhost::EchoSender(EchoReply(kSensor, 77, '\x81', 17), 77, LanBridge()), "");
  const std::string whole = EchoReply(kSensor, 77);
  for (size_t size = 0; size < whole.size(); ++size) {
    EXPECT_EQ(vornhost::EchoSender(whole.substr(0, size), 77, LanBridge()), "") << size;
  }
}

// ---- stations

TEST(Stations, WhatTheWirelessDaemonSaysIsChecked) {
  Json::Value list;
  list.append("text");
  list.append(Json::Value(Json::objectValue))["mac"] = 5;
  Json::Value &good = list.append(Json::Value(Json::objectValue));
  good["mac"] = "F8:E4:3B:11:22:66";
  good["ip"] = "192.168.2.110; id";
  good["hostname"] = "?";
  good["signalstrength"] = -61;
  good["transferRX"] = "12";
  good["transferTX"] = Json::UInt64(5000000000U);
  std::vector<vornhost::WifiStation> stations;
  vornhost::AppendStations(list, "gwlan0", stations);
  ASSERT_EQ(stations.size(), 1U);
  EXPECT_EQ(stations[0].mac, "f8:e4:3b:11:22:66");
  EXPECT_EQ(stations[0].network, "gwlan0");
  EXPECT_EQ(stations[0].ip, "");
  EXPECT_EQ(stations[0].name, "");
  EXPECT_EQ(stations[0].radio, (vornhost::RadioFigures{-61, 0, 5000000000}));
  vornhost::AppendStations(Json::Value("no list"), "wlan0", stations);
  EXPECT_EQ(stations.size(), 1U);
}

} // namespace
