// What a MAC filter may say, and the texts that are made of it.
#include "host/wireless/adapter_config.h"
#include "host/wireless/mac_filter.h"
#include "host/wireless/network_acl.h"

#include <gmock/gmock.h>
#include <json/reader.h>

#include <memory>
#include <stdexcept>

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using vornhost::MacFilter;
using vornhost::ParseMacFilter;
using vornhost::WithFilterLines;

Json::Value Parse(const std::string &text) {
  Json::Value value;
  std::string errors;
  const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  EXPECT_TRUE(reader->parse(text.data(), text.data() + text.size(), &value, &errors)) << errors;
  return value;
}

MacFilter Filter(const std::string &policy, const std::string &list) {
  return ParseMacFilter(Parse(R"({"mac_filter_policy":)" + policy + R"(,"mac_filter_list":)" + list + "}"));
}

std::string FaultOf(const std::string &policy, const std::string &list) {
  try {
    Filter(policy, list);
  } catch (const std::runtime_error &error) {
    return error.what();
  }
  return "none";
}

TEST(MacFilter, EntriesThatAreOffDoNotCount) {
  const MacFilter filter =
      Filter(R"("deny")", R"([{"mac":"02:00:00:00:01:0A","mac_filter_enabled":true,"desc":"a\n<b>"},
                       {"mac":"02-00-00-00-02-00","mac_filter_enabled":null},{"mac":"02:00:00:00:04:00","desc":null},
                       {"mac":"02:00:00:00:03:00","mac_filter_enabled":false}])");
  EXPECT_THAT(filter.macs, ElementsAre("02:00:00:00:01:0a", "02:00:00:00:02:00", "02:00:00:00:04:00"));
}

TEST(MacFilter, PolicySaysWhoMayConnect) {
  const std::string list = R"([{"mac":"02:00:00:00:01:00"}])";
  const std::string listed = "02:00:00:00:01:00";
  const std::string other = "02:00:00:00:02:00";
  EXPECT_TRUE(Filter(R"("disable")", list).Permits(listed) && Filter(R"("disable")", list).Permits(other));
  EXPECT_TRUE(Filter(R"("allow")", list).Permits(listed));
  EXPECT_FALSE(Filter(R"("allow")", list).Permits(other));
  EXPECT_FALSE(Filter(R"("deny")", list).Permits(listed));
  EXPECT_TRUE(Filter(R"("deny")", list).Permits(other));
  EXPECT_FALSE(Filter(R"("allow")", "[]").Permits(listed));
}

TEST(MacFilter, PolicyThatIsNoneIsRefused) {
  for (const char *policy : {R"("")", R"("Deny")", R"("reject")", "null", "1", "true", "{}", R"(["deny"])"}) {
    EXPECT_THAT(FaultOf(policy, "[]"), HasSubstr("no such policy")) << policy;
  }
}

TEST(MacFilter, ListThatIsNoneIsRefused) {
  for (const char *list : {"null", "{}", R"({"0":{"mac":"02:00:00:00:01:00"}})", "1", R"("[]")"}) {
    EXPECT_THAT(FaultOf(R"("deny")", list), HasSubstr("no array")) << list;
  }
  EXPECT_THROW(ParseMacFilter(Json::Value()), std::runtime_error);
  EXPECT_THROW(ParseMacFilter(Json::Value("x")), std::runtime_error);
}

TEST(MacFilter, EntryThatIsNoneIsRefusedAlsoWhenItIsOff) {
  for (const char *entry : {"1",
                            "null",
                            R"("02:00:00:00:01:00")",
                            "[]",
                            "{}",
                            R"({"mac":null})",
                            R"({"mac":5})",
                            R"({"mac":""})",
                            R"({"mac":"02:00:00:00:01"})",
                            R"({"mac":"02:00:00:00:01:00 "})",
                            R"({"mac":"ff:ff:ff:ff:ff:ff"})",
                            R"({"mac":"01:00:5e:00:00:01"})",
                            R"({"mac":"00:00:00:00:00:00"})",
                            R"({"mac":"33:33:00:00:00:01"})",
                            R"({"mac":"01:00:5e:00:00:01","mac_filter_enabled":false})",
                            R"({"mac":"02:00:00:00:01:00\n02:00:00:00:02:00"})",
                            R"({"mac":"02:00:00:00:01:00\u0000"})",
                            R"({"mac":"02:00:00:00:01:00","mac_filter_enabled":1})",
                            R"({"mac":"02:00:00:00:01:00","mac_filter_enabled":"no"})",
                            R"({"mac":"02:00:00:00:01:00","desc":[]})"}) {
    EXPECT_NE(FaultOf(R"("deny")", std::string("[") + entry + "]"), "none") << entry;
    EXPECT_NE(FaultOf(R"("deny")", std::string(R"([{"mac":"02:00:00:00:09:00"},)") + entry + "]"), "none") << entry;
  }
}

TEST(MacFilter, ListFileIsAnAddressALine) {
  EXPECT_EQ(vornhost::RenderMacList({"02:00:00:00:02:00", "02:00:00:00:01:00"}),
            "# Made from the adapter's configuration; changes here are lost.\n02:00:00:00:01:00\n02:00:00:00:02:00\n");
}

TEST(HostapdFilterLines, GoIntoEveryNetworkInThePlaceOfOldOnes) {
  EXPECT_EQ(WithFilterLines("# mine\ninterface=wlan0\nssid=a\nmacaddr_acl=2\nwpa_passphrase=x\n\nbss=gwlan0\n"
                            "deny_mac_file=/etc/old\nssid=g",
                            "/A", "/D", 1),
            "# mine\ninterface=wlan0\nmacaddr_acl=1\naccept_mac_file=/A\ndeny_mac_file=/D\nssid=a\nwpa_passphrase=x\n\n"
            "bss=gwlan0\nmacaddr_acl=1\naccept_mac_file=/A\ndeny_mac_file=/D\nssid=g\n");
}

TEST(HostapdFilterLines, OnceThereTheyStayAsTheyAre) {
  const std::string once = WithFilterLines("interface=wlan0\nbss=gwlan0\n", "/A", "/D", 0);
  EXPECT_EQ(WithFilterLines(once, "/A", "/D", 0), once);
}

TEST(HostapdFilterLines, CommentsAndLongerKeysAreOthers) {
  const std::string content = "#macaddr_acl=0\ninterface2=x\nmacaddr_acl_x=1\n#bss=x\n";
  EXPECT_EQ(WithFilterLines(content, "/A", "/D", 0), content);
}

TEST(AdapterText, LeavesOutWhatIsOnTheAirAndKeepsEverythingElse) {
  const Json::Value config =
      Parse(R"({"enabled":true,"guest_enabled":false,"colour":[1,2.5,null],"name":"Küche\u0000"})");
  const Json::Value back = Parse(vornhost::RenderAdapterConfig(config));
  EXPECT_EQ(back, Parse(R"({"colour":[1,2.5,null],"name":"Küche\u0000"})"));
}

TEST(AdapterText, WhatCouldNotBeReadBackIsRefused) {
  Json::Value config(Json::objectValue);
  config["desc"] = "\xff\xfe";
  EXPECT_THROW(vornhost::RenderAdapterConfig(config), std::runtime_error);
  Json::Value deep;
  for (int i = 0; i < 100; ++i) {
    Json::Value outer(Json::arrayValue);
    outer.append(deep);
    deep = outer;
  }
  config["desc"] = deep;
  EXPECT_THROW(vornhost::RenderAdapterConfig(config), std::runtime_error);
}

TEST(NetworkAcl, IsWhatTheNetworksOwnPartOfTheFileSays) {
  const std::string content = "macaddr_acl=2\n# macaddr_acl=2\ninterface=wlan0\nmacaddr_acl=1\naccept_mac_file=/a\n"
                              "#deny_mac_file=/x\naccept_mac_file=/b\nbss=gwlan0\ndeny_mac_file=/c=d\nbss=other\n";
  const auto home = vornhost::ParseNetworkAcl(content, "wlan0");
  EXPECT_EQ(home.macaddrAcl, "1");
  EXPECT_THAT(home.acceptFiles, ElementsAre("/a", "/b"));
  EXPECT_THAT(home.denyFiles, IsEmpty());
  const auto guests = vornhost::ParseNetworkAcl(content, "gwlan0");
  EXPECT_EQ(guests.macaddrAcl, "0");
  EXPECT_THAT(guests.acceptFiles, IsEmpty());
  EXPECT_THAT(guests.denyFiles, ElementsAre("/c=d"));
  EXPECT_EQ(vornhost::ParseNetworkAcl(content, "other").macaddrAcl, "0");
}

} // namespace
