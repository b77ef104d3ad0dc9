// The names of guests: known by what they say when they are asked, behind the firewall that keeps them from the router,
// and with nothing of one network told to the other.
#include "host/devices/device_store.h"
#include "platform/netclient.h"
#include "tests/host/devices/packets.h"
#include "tests/host/devices/scanner_process.h"
#include "tests/host/files.h"
#include "tests/host/network/shell.h"

#include <arpa/inet.h>
#include <gmock/gmock.h>
#include <linux/if_packet.h>
#include <net/ethernet.h>
#include <netinet/in.h>
#include <sys/socket.h>

#include <array>

namespace {

using hosttest::DnsName;
using hosttest::DnsRecord;
using hosttest::Eventually;
using hosttest::FarHost;
using testing::HasSubstr;
using testing::Not;
using vornhost::UniqueFd;

constexpr char kGuest[] = "f8:e4:3b:11:22:66";
constexpr char kLaptop[] = "d4:3d:7e:11:22:33";

sockaddr_in AddressOf(const char *ip, uint16_t port) {
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_port = htons(port);
  inet_pton(AF_INET, ip, &address.sin_addr);
  return address;
}

// A host that answers questions by multicast DNS, and keeps every frame that reaches it.
class NamedHost {
public:
  NamedHost(const std::string &bridge, const std::string &port, const std::string &mac, const std::string &ip,
            std::string answer)
      : host_(bridge, port, mac), answer_(std::move(answer)) {
    frames_ = host_.Open(AF_PACKET, SOCK_RAW, htons(ETH_P_ALL));
    host_.Run("sysctl -qw net.ipv6.conf.eth0.disable_ipv6=1; ip link set eth0 up; ip addr add " + ip +
              "/24 dev eth0; ip route add default via " + ip.substr(0, ip.rfind('.')) + ".1");
    names_ = host_.Open(AF_INET, SOCK_DGRAM, 0);
    const sockaddr_in any = AddressOf("0.0.0.0", 5353);
    EXPECT_EQ(bind(names_.Get(), reinterpret_cast<const sockaddr *>(&any), sizeof(any)), 0);
    ip_mreqn group{}; // of the network that the socket was made in
    inet_pton(AF_INET, "224.0.0.251", &group.imr_multiaddr);
    inet_pton(AF_INET, ip.c_str(), &group.imr_address);
    EXPECT_EQ(setsockopt(names_.Get(), IPPROTO_IP, IP_ADD_MEMBERSHIP, &group, sizeof(group)), 0);
    const sockaddr_in router = AddressOf((ip.substr(0, ip.rfind('.')) + ".1").c_str(), 9); // so that it is seen
    sendto(names_.Get(), "", 0, 0, reinterpret_cast<const sockaddr *>(&router), sizeof(router));
  }

  // Answers what has come.
  void Serve() {
    std::array<char, 9000> buffer{};
    sockaddr_in from{};
    socklen_t length = sizeof(from);
    while (recvfrom(names_.Get(), buffer.data(), buffer.size(), 0, reinterpret_cast<sockaddr *>(&from), &length) > 0) {
      sendto(names_.Get(), answer_.data(), answer_.size(), 0, reinterpret_cast<sockaddr *>(&from), sizeof(from));
    }
    sockaddr_ll way{};
    length = sizeof(way);
    for (ssize_t size = 0; (size = recvfrom(frames_.Get(), buffer.data(), buffer.size(), 0,
                                            reinterpret_cast<sockaddr *>(&way), &length)) > 0;) {
      if (way.sll_pkttype != PACKET_OUTGOING) {
        heard_.append(buffer.data(), static_cast<size_t>(size));
      }
    }
  }

  void Announce(const char *to) const {
    const sockaddr_in address = AddressOf(to, 5353);
    sendto(names_.Get(), answer_.data(), answer_.size(), 0, reinterpret_cast<const sockaddr *>(&address),
           sizeof(address));
  }

  const std::string &Heard() const { return heard_; }

private:
  FarHost host_;
  std::string answer_;
  UniqueFd frames_;
  UniqueFd names_;
  std::string heard_;
};

// "The name of IP is NAME", with IP's last two bytes as they are written.
std::string NameAnswer(const std::vector<std::string> &reverse, const std::string &name) {
  std::vector<std::string> labels = reverse;
  labels.insert(labels.end(), {"168", "192", "in-addr", "arpa"});
  return hosttest::DnsAnswer({DnsRecord(DnsName(labels), 12, DnsName({name, "local"}))});
}

class GuestNames : public testing::Test {
protected:
  void SetUp() override {
    hosttest::MakeCable();
    hosttest::Shell("ip addr del 192.168.0.1/16 dev lbr0; ip addr add 192.168.1.1/24 dev lbr0;"
                    "ip link add gbr0 address 02:00:5e:00:00:02 type bridge; ip addr add 192.168.2.1/24 dev gbr0; ip "
                    "link set gbr0 up;"
                    "sysctl -qw net.ipv4.conf.gbr0.arp_accept=1; nft -f " VORN_BASE_FIREWALL);
    hosttest::FreshFolder("/var/lib/vorn");
  }
  void TearDown() override { hosttest::RemoveLinks(); }

  static std::string NameOf(const std::string &mac, const std::string &source = "mdns") {
    Json::Value result;
    EXPECT_EQ(vornnetwork::dbus::NetClient().GetDeviceListData(source, result), 0);
    for (const Json::Value &entry : result["ClientList"]) {
      if (entry["macAddr"] == mac) {
        return entry["netif"].asString() + " " + entry["displayName"].asString();
      }
    }
    return "";
  }
};

TEST_F(GuestNames, AGuestSaysItsNameWhenItIsAsked) {
  NamedHost guest("gbr0", "guest1", kGuest, "192.168.2.110", NameAnswer({"110", "2"}, "annas-phone"));
  const hosttest::ScannerProcess scanner;
  EXPECT_TRUE(Eventually(20000, [&guest] {
    guest.Serve();
    return NameOf(kGuest) == "gbr0 annas-phone";
  }));
}

TEST_F(GuestNames, WhatAGuestSaysUnaskedStaysOutside) {
  NamedHost guest("gbr0", "guest1", kGuest, "192.168.2.110", NameAnswer({"110", "2"}, "annas-phone"));
  const hosttest::ScannerProcess scanner;
  EXPECT_TRUE(Eventually(20000, [] { return NameOf(kGuest, "arp") == "gbr0 "; }));
  for (int i = 0; i < 30; ++i) {
    guest.Announce("224.0.0.251");
    guest.Announce("192.168.2.1");
    hosttest::Sleep(100);
  }
  EXPECT_EQ(NameOf(kGuest), "");
}

TEST_F(GuestNames, NeitherNetworkHearsOfTheOther) {
  NamedHost laptop("lbr0", "lan2", kLaptop, "192.168.1.77", NameAnswer({"77", "1"}, "owners-laptop"));
  NamedHost guest("gbr0", "guest1", kGuest, "192.168.2.110", NameAnswer({"110", "2"}, "annas-phone"));
  NamedHost other("gbr0", "guest2", "f8:e4:3b:11:22:67", "192.168.2.111", NameAnswer({"111", "2"}, "bobs-phone"));
  const hosttest::ScannerProcess scanner;
  EXPECT_TRUE(Eventually(30000, [&] {
    laptop.Serve();
    guest.Serve();
    other.Serve();
    return NameOf(kLaptop) == "lbr0 owners-laptop" && NameOf(kGuest) == "gbr0 annas-phone" &&
           NameOf("f8:e4:3b:11:22:67") == "gbr0 bobs-phone";
  }));
  hosttest::Sleep(3000);
  laptop.Serve();
  guest.Serve();
  for (const std::string &lans : {std::string("owners-laptop"), DnsName({"77", "1", "168"}).substr(0, 9),
                                  std::string("\xc0\xa8\x01\x4d", 4), std::string("bobs-phone")}) {
    EXPECT_THAT(guest.Heard(), Not(HasSubstr(lans)));
  }
  EXPECT_THAT(guest.Heard(), HasSubstr(DnsName({"110", "2", "168"}).substr(0, 10))); // or it was not asked
  EXPECT_THAT(guest.Heard(), Not(HasSubstr(DnsName({"111", "2", "168"}).substr(0, 10))));
  for (const std::string &guests :
       {std::string("annas-phone"), DnsName({"110", "2", "168"}).substr(0, 10), std::string("\xc0\xa8\x02\x6e", 4)}) {
    EXPECT_THAT(laptop.Heard(), Not(HasSubstr(guests)));
  }
}

TEST_F(GuestNames, AGuestCannotNameADeviceOfTheLan) {
  NamedHost laptop("lbr0", "lan2", kLaptop, "192.168.1.77", NameAnswer({"77", "1"}, "owners-laptop"));
  NamedHost guest("gbr0", "guest1", kGuest, "192.168.2.110", NameAnswer({"77", "1"}, "stolen"));
  const hosttest::ScannerProcess scanner;
  EXPECT_TRUE(Eventually(20000, [&] {
    laptop.Serve();
    guest.Serve();
    return NameOf(kLaptop) == "lbr0 owners-laptop" && guest.Heard().find("in-addr") != std::string::npos;
  }));
  hosttest::Sleep(2000);
  guest.Serve();
  EXPECT_EQ(NameOf(kLaptop), "lbr0 owners-laptop");
  EXPECT_EQ(NameOf(kGuest), "");
}

} // namespace
