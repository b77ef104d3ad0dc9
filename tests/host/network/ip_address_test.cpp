#include "platform/wifi.h"

#include <gtest/gtest.h>
#include <sys/socket.h>

#include <string>
#include <vector>

namespace {

using vornwireless::utils::IPAddress;

std::vector<int> Bytes(const IPAddress &address, size_t count) {
  return {address.GetBytes(), address.GetBytes() + count};
}

TEST(IpAddress, BeginsAsNone) {
  const IPAddress address;
  EXPECT_EQ(address.GetFamily(), AF_UNSPEC);
  EXPECT_FALSE(address.IsValid());
  EXPECT_EQ(address.GetText(), "");
  EXPECT_EQ(address.GetBytes(), nullptr);
}

TEST(IpAddress, TakesIpv4) {
  IPAddress address;
  address = "192.168.1.20";
  EXPECT_EQ(address.GetFamily(), AF_INET);
  EXPECT_EQ(Bytes(address, 4), (std::vector<int>{192, 168, 1, 20}));
}

TEST(IpAddress, TakesIpv6) {
  IPAddress address;
  address = "2001:db8::ff00:1";
  EXPECT_EQ(address.GetFamily(), AF_INET6);
  EXPECT_EQ(Bytes(address, 16), (std::vector<int>{0x20, 1, 0xd, 0xb8, 0, 0, 0, 0, 0, 0, 0, 0, 0xff, 0, 0, 1}));
}

TEST(IpAddress, KeepsATextThatIsNone) {
  for (const std::string text : {"", "192.168.1", "192.168.1.01", "1.2.3.4 ", "fe80::1%eth0", "::1/64", "host",
                                 "1.2.3.4;x", ":::", "256.1.1.1"}) {
    IPAddress address;
    address = "10.0.0.1";
    address = text;
    EXPECT_FALSE(address.IsValid()) << text;
    EXPECT_EQ(address.GetFamily(), AF_UNSPEC);
    EXPECT_EQ(address.GetText(), text);
    EXPECT_EQ(address.GetBytes(), nullptr);
  }
}

TEST(IpAddress, SeesWhatStandsAfterANul) {
  IPAddress address;
  address = std::string("10.0.0.1\0x", 10);
  EXPECT_FALSE(address.IsValid());
}

TEST(IpAddress, IsCopiedWhole) {
  IPAddress address;
  address = "10.0.0.1";
  const IPAddress copy = address;
  address = "none";
  EXPECT_EQ(Bytes(copy, 4), (std::vector<int>{10, 0, 0, 1}));
}

} // namespace
