// MAC addresses, names, leases and the presence file: what is taken, what is not.
#include "host/devices/device_text.h"
#include "host/devices/lease_file.h"
#include "host/devices/mac_address.h"
#include "host/devices/presence_file.h"
#include "host/devices/vendors.h"

#include <gmock/gmock.h>

#include <sstream>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;
using testing::UnorderedElementsAre;
using vornhost::CleanName;
using vornhost::CleanText;
using vornhost::ParseDeviceMac;
using vornhost::ParseLeases;

TEST(MacAddress, EveryFormGivesTheOneOfTheStore) {
  for (const char *text : {"d4:3d:7e:11:22:33", "D4:3D:7E:11:22:33", "D4-3d-7e-11-22-33", "D43D7E112233"}) {
    EXPECT_EQ(ParseDeviceMac(text), "d4:3d:7e:11:22:33") << text;
  }
}

TEST(MacAddress, WhatIsNoneIsRefused) {
  for (const char *text : {"", "d4:3d:7e:11:22", "d4:3d:7e:11:22:33:44", "d4:3d-7e:11:22:33", "d4.3d.7e.11.22.33",
                           "g4:3d:7e:11:22:33", "d4:3d:7e:11:22:3", " d4:3d:7e:11:22:33", "d43d7e11223", "$(id)"}) {
    EXPECT_EQ(ParseDeviceMac(text), std::nullopt) << text;
  }
  EXPECT_EQ(ParseDeviceMac(std::string_view("d4:3d:7e:11:22:33\0", 18)), std::nullopt);
}

TEST(MacAddress, NoDevicesOnesAreRefused) {
  EXPECT_EQ(ParseDeviceMac("00:00:00:00:00:00"), std::nullopt);
  EXPECT_EQ(ParseDeviceMac("ff:ff:ff:ff:ff:ff"), std::nullopt);
  EXPECT_EQ(ParseDeviceMac("01:00:5e:00:00:fb"), std::nullopt);
}

TEST(MacAddress, BytesAreWhatTheTextSays) {
  uint8_t bytes[vornhost::kMacBytes] = {};
  vornhost::MacBytes("d4:3d:7e:01:a2:3f", bytes);
  EXPECT_EQ(vornhost::MacText(bytes), "d4:3d:7e:01:a2:3f");
  EXPECT_FALSE(vornhost::IsPrivateMac("d4:3d:7e:01:a2:3f"));
  EXPECT_TRUE(vornhost::IsPrivateMac("d6:3d:7e:01:a2:3f"));
}

TEST(DeviceText, MarkupAndLettersOfAllLanguagesStay) {
  EXPECT_EQ(CleanText("<script>alert('$(id)')</script>"), "<script>alert('$(id)')</script>");
  EXPECT_EQ(CleanText("B\xc3\xbcro \xe6\x9d\xb1 \xf0\x9f\x96\xa8"), "B\xc3\xbcro \xe6\x9d\xb1 \xf0\x9f\x96\xa8");
}

TEST(DeviceText, ControlCharactersAndBrokenBytesGo) {
  EXPECT_EQ(CleanText(std::string_view("a\0b\x1b[31m\n\r\tc\x7f", 12)), "ab[31mc");
  EXPECT_EQ(CleanText("a\xc2\x85z"), "az");         // C1
  EXPECT_EQ(CleanText("a\xe2\x80\xaez"), "az");     // right-to-left override
  EXPECT_EQ(CleanText("\xff\xfe x \xc3"), "x");     // none of UTF-8, and half a character
  EXPECT_EQ(CleanText("a\xc0\xafz"), "az");         // overlong
  EXPECT_EQ(CleanText("a\xe0\x80\xafz"), "az");     // overlong
  EXPECT_EQ(CleanText("a\xed\xa0\x80z"), "az");     // surrogate
  EXPECT_EQ(CleanText("a\xf4\x90\x80\x80z"), "az"); // beyond the last
}

TEST(DeviceText, LongTextsAreCutBetweenCharacters) {
  EXPECT_EQ(CleanText(std::string(300, 'a')).size(), 255U);
  std::string text;
  for (int i = 0; i < 200; ++i) {
    text += "\xc3\xbc";
  }
  EXPECT_EQ(CleanText(text).size(), 254U);
}

TEST(DeviceText, TheOwnersTextsAreKeptWholeOrNotAtAll) {
  EXPECT_TRUE(vornhost::IsCleanText(""));
  EXPECT_TRUE(vornhost::IsCleanText(" <b>B\xc3\xbcro</b> "));
  EXPECT_TRUE(vornhost::IsCleanText(std::string(255, 'a')));
  EXPECT_FALSE(vornhost::IsCleanText(std::string(256, 'a')));
  EXPECT_FALSE(vornhost::IsCleanText("a\nb"));
  EXPECT_FALSE(vornhost::IsCleanText(std::string_view("a\0b", 3)));
  EXPECT_FALSE(vornhost::IsCleanText("\xc3"));
}

TEST(DeviceName, PlaceholdersAreNone) {
  for (const char *text : {"?", "*", "<unknown>", "<UNKNOWN>", "(none)", "localhost", "localhost.localdomain",
                           "LOCALHOST", "wpad", "wpad.lan", "", "  ", "."}) {
    EXPECT_EQ(CleanName(text), "") << text;
  }
}

TEST(DeviceName, TheHomesOwnDomainGoes) {
  EXPECT_EQ(CleanName("printer.local"), "printer");
  EXPECT_EQ(CleanName("printer.local."), "printer");
  EXPECT_EQ(CleanName("Printer.LAN"), "Printer");
  EXPECT_EQ(CleanName("www.example.org"), "www.example.org");
}

std::string Shown(const std::vector<vornhost::Lease> &leases) {
  std::ostringstream text;
  for (const vornhost::Lease &lease : leases) {
    text << lease.mac << ' ' << lease.ip << " [" << lease.name << "] ";
  }
  return text.str();
}

TEST(Leases, ARecordALine) {
  EXPECT_EQ(Shown(ParseLeases("1700000000 D4:3D:7e:11:22:33 192.168.1.110 laptop 01:d4:3d:7e:11:22:33\n"
                              "1700000001 3c:2a:f4:11:22:44 192.168.1.111 * *\n")),
            "d4:3d:7e:11:22:33 192.168.1.110 [laptop] 3c:2a:f4:11:22:44 192.168.1.111 [] ");
}

TEST(Leases, LinesThatAreCutShortSayNothing) {
  const std::string whole = "1700000000 d4:3d:7e:11:22:33 192.168.1.110 laptop *\n";
  for (size_t size = 0; size < whole.size(); ++size) {
    EXPECT_THAT(ParseLeases(whole.substr(0, size)), IsEmpty()) << size;
    if (size < whole.size() - 2) { // whose last field is all there
      EXPECT_THAT(ParseLeases(whole.substr(0, size) + "\n"), IsEmpty()) << size;
    }
  }
}

TEST(Leases, BadFieldsCostTheirLineOnly) {
  EXPECT_EQ(Shown(ParseLeases("x d4:3d:7e:11:22:33 192.168.1.110 a *\n"
                              "-5 d4:3d:7e:11:22:33 192.168.1.110 a *\n"
                              "1 d4:3d:7e:11:22 192.168.1.110 a *\n"
                              "1 d4:3d:7e:11:22:33 192.168.1.999 a *\n"
                              "1 d4:3d:7e:11:22:33 $(id) a *\n"
                              "\n"
                              "1 3c:2a:f4:11:22:44 192.168.1.111 good *\n"
                              "duid 00:01\n"
                              "1 00:40:8c:11:22:55 192.168.1.112 after-duid *\n")),
            "3c:2a:f4:11:22:44 192.168.1.111 [good] ");
}

TEST(Leases, AMacAddressThatStandsTwiceIsOneDevice) {
  const std::string early = "100 d4:3d:7e:11:22:33 192.168.1.110 laptop 01:aa\n";
  const std::string late = "200 d4:3d:7e:11:22:33 192.168.1.150 * ff:bb\n";
  const std::string always = "0 d4:3d:7e:11:22:33 192.168.1.9 fixed *\n";
  EXPECT_EQ(Shown(ParseLeases(early + late)), "d4:3d:7e:11:22:33 192.168.1.150 [laptop] ");
  EXPECT_EQ(Shown(ParseLeases(late + early)), "d4:3d:7e:11:22:33 192.168.1.150 [] ");
  EXPECT_EQ(Shown(ParseLeases(always + late)), "d4:3d:7e:11:22:33 192.168.1.9 [fixed] ");
}

TEST(Leases, NamesAreCleaned) {
  EXPECT_EQ(Shown(ParseLeases("1 d4:3d:7e:11:22:33 192.168.1.110 <b>\x1b$(id)\xff *\n")),
            "d4:3d:7e:11:22:33 192.168.1.110 [<b>$(id)] ");
}

TEST(PresenceText, ComesBackAsItWas) {
  vornhost::PresenceMap presence;
  presence["d4:3d:7e:11:22:33"] = {12345, std::nullopt};
  presence["3c:2a:f4:11:22:44"] = {99, vornhost::RadioFigures{-61, 1000, 2000}};
  EXPECT_EQ(vornhost::ParsePresence(vornhost::RenderPresence(presence)), presence);
}

TEST(PresenceText, BadLinesArePassedOver) {
  const auto presence = vornhost::ParsePresence("\nx 1\nd4:3d:7e:11:22:33\nd4:3d:7e:11:22:33 x\nd4:3d:7e:11:22:33 1 2\n"
                                                "d4:3d:7e:11:22:33 99999999999999999999\n3c:2a:f4:11:22:44 7\n");
  EXPECT_THAT(presence, UnorderedElementsAre(Pair("3c:2a:f4:11:22:44", vornhost::Presence{7, std::nullopt})));
}

TEST(Vendors, AreThoseOfTheRegistries) {
  EXPECT_THAT(vornhost::VendorsOf({"3c:2a:f4:11:22:44", "00:22:72:00:00:01", "02:22:72:00:00:01", "f0:00:00:00:00:01"}),
              UnorderedElementsAre(Pair("3c:2a:f4:11:22:44", "Brother Industries, LTD."),
                                   Pair("00:22:72:00:00:01", "American Micro-Fuel Device Corp.")));
}

TEST(Vendors, TheLongestPrefixCounts) {
  // 70B3D5 is the registry's own, which gives it away in parts of 36 bits.
  EXPECT_THAT(vornhost::VendorsOf({"70:b3:d5:71:90:01"}), ElementsAre(Pair("70:b3:d5:71:90:01", "2M Technology")));
}

} // namespace
