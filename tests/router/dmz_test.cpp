// The DMZ and LocalLan rows over the scripted platform.
#include "router/mervane_base.h"
#include "router/portforward.h"
#include "tests/router/portforward_calls.h"

#include <gmock/gmock.h>

using scripted::Exchange;
using scripted::Get;
using scripted::Join;
using scripted::kCheckFolder;
using scripted::kFolder;
using scripted::kMkdir;
using scripted::kRestart;
using scripted::Lines;
using testing::Contains;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;
using testing::Not;

namespace {

constexpr char kDmzFile[] = "/etc/portforward/routerpf/dmz.conf";
const std::string kEnumerate = "QARDNetInterfaceEnum(32, 2)";
const std::string kLan = "VORNNetIFGetInfo(lbr0, 0)";
const std::string kGuest = "VORNNetIFGetInfo(gbr0, 0)";
const std::string kLanFault = "portforward: VORNNetIFGetInfo(lbr0) fail![0x0300 netif.cpp:42]";
const std::string kExists = std::string("QARDCFileExist(") + kDmzFile + ")";
const std::string kUnlink = std::string("QARDCSysUnlink(") + kDmzFile + ")";
const std::string kSetEnabled = std::string("QARDCFileSetKeyValue(") + kDmzFile + ", enabled, yes, %s=\"%s\"\n)";
const std::string kSetIp = std::string("QARDCFileSetKeyValue(") + kDmzFile + ", dmz_ip, 192.168.1.112, %s=\"%s\"\n)";
const std::string kReadIp = std::string("QARDCFileGetKeyValue(") + kDmzFile + ", dmz_ip, 1024, 0)";
const std::string kReadEnabled = std::string("QARDCFileGetKeyValue(") + kDmzFile + ", enabled, 1024, 0)";
const std::string kIpInLan = "VORNNetIsSameSubnet(192.168.1.112, 192.168.1.1, 255.255.255.0)";
const std::string kIpInGuest = "VORNNetIsSameSubnet(192.168.1.112, 192.168.2.1, 255.255.255.0)";

const Lines kReadBoth = {"HasParam(enable)", "GetParam(enable, null)", "HasParam(ip)", "GetParam(ip, null)"};
const Lines kReadEnable = {"HasParam(enable)", "GetParam(enable, null)", "HasParam(ip)"};

Json::Value Dmz(const Json::Value &enable) {
  Json::Value parameters(Json::objectValue);
  parameters["enable"] = enable;
  return parameters;
}

Json::Value Dmz(const Json::Value &enable, const Json::Value &ip) {
  Json::Value parameters = Dmz(enable);
  parameters["ip"] = ip;
  return parameters;
}

class LanTest : public testing::Test {
protected:
  void SetUp() override {
    scripted::Reset();
    Get().lans = {{"lbr0", "192.168.1.1", "255.255.255.0"}, {"gbr0", "192.168.2.1", "255.255.255.0"}};
    Get().subnets = {{"192.168.1.1", {"192.168.1.112"}}, {"192.168.2.1", {"192.168.2.113"}}};
    Get().folders = {kFolder};
  }
  static void Store(const std::string &key, const std::string &value) {
    Get().keyValues[std::string(kDmzFile) + " " + key] = value;
  }
  static void Fresh() {
    Get().calls.clear();
    Get().log.clear();
  }
};

using DmzTest = LanTest;
using LocalLanTest = LanTest;

TEST_F(DmzTest, Get_AnswersWhatIsStored) {
  Store("dmz_ip", "192.168.1.112");
  Store("enabled", "yes");
  Exchange exchange;
  exchange.Run(GetDMZ);
  EXPECT_THAT(Get().calls, ElementsAre(kReadIp, kEnumerate, kLan, kIpInLan, kReadEnabled,
                                       R"(SetSuccess({"enable":true,"ip":"192.168.1.112"}))"));
}

TEST_F(DmzTest, Get_WithoutAFileAnswersNull) {
  Get().results = {{kReadIp, -1}, {kReadEnabled, -1}};
  Exchange exchange;
  exchange.Run(GetDMZ);
  EXPECT_THAT(Get().calls, ElementsAre(kReadIp, kReadEnabled, "SetSuccess(null)"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(DmzTest, Get_AddressOutsideEveryLanIsLeftOut) {
  Store("dmz_ip", "203.0.113.9");
  Store("enabled", "yes");
  Exchange exchange;
  exchange.Run(GetDMZ);
  EXPECT_EQ(exchange.Answer(), R"(SetSuccess({"enable":true}))");
}

TEST_F(DmzTest, Get_AnyOtherTextThanYesIsOff) {
  for (const char *text : {"no", "YES", "1", "yes ", "true"}) {
    Store("enabled", text);
    Exchange exchange;
    exchange.Run(GetDMZ);
    EXPECT_EQ(exchange.Answer(), R"(SetSuccess({"enable":false}))") << text;
  }
}

TEST_F(DmzTest, Get_EmptyTextsAreAsAbsent) {
  Exchange exchange;
  exchange.Run(GetDMZ);
  EXPECT_THAT(Get().calls, ElementsAre(kReadIp, kReadEnabled, "SetSuccess(null)"));
}

TEST_F(DmzTest, SetOn_WritesBothKeysAndRestarts) {
  Exchange exchange(Dmz(true, "192.168.1.112"));
  exchange.Run(SetDMZ);
  EXPECT_THAT(
      Get().calls,
      ElementsAreArray(Join(
          {kReadBoth, {kEnumerate, kLan, kIpInLan, kCheckFolder, kSetEnabled, kSetIp, kRestart, "SetSuccess(null)"}})));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(DmzTest, SetOn_MakesTheFolderWhenItIsMissing) {
  Get().folders.clear();
  Exchange exchange(Dmz(true, "192.168.1.112"));
  exchange.Run(SetDMZ);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kReadBoth,
                                                  {kEnumerate, kLan, kIpInLan, kCheckFolder, kMkdir, kSetEnabled,
                                                   kSetIp, kRestart, "SetSuccess(null)"}})));
}

TEST_F(DmzTest, SetOn_AddressInALaterLanIsFound) {
  Get().subnets = {{"192.168.2.1", {"192.168.1.112"}}};
  Exchange exchange(Dmz(true, "192.168.1.112"));
  exchange.Run(SetDMZ);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kReadBoth,
                                                  {kEnumerate, kLan, kIpInLan, kGuest, kIpInGuest, kCheckFolder,
                                                   kSetEnabled, kSetIp, kRestart, "SetSuccess(null)"}})));
}

TEST_F(DmzTest, SetOn_UnreadableInterfaceIsLoggedAndPassedOver) {
  Get().results[kLan] = -1;
  Get().subnets["192.168.2.1"].insert("192.168.1.112");
  Exchange exchange(Dmz(true, "192.168.1.112"));
  exchange.Run(SetDMZ);
  EXPECT_EQ(exchange.Answer(), "SetSuccess(null)");
  EXPECT_THAT(Get().log, ElementsAre(kLanFault));
}

TEST_F(DmzTest, SetOn_SubnetThatCannotBeToldDoesNotHoldTheAddress) {
  Get().results = {{kIpInLan, -1}, {kIpInGuest, -1}};
  Exchange exchange(Dmz(true, "192.168.1.112"));
  exchange.Run(SetDMZ);
  EXPECT_EQ(exchange.Answer(), R"(SetError(4300, {"enable":true,"ip":"192.168.1.112"}))");
}

TEST_F(DmzTest, SetOn_AddressOutsideEveryLanFailsAndChangesNothing) {
  Get().subnets.clear();
  Exchange exchange(Dmz(true, "192.168.1.112"));
  exchange.Run(SetDMZ);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kReadBoth,
                                                  {kEnumerate, kLan, kIpInLan, kGuest, kIpInGuest,
                                                   R"(SetError(4300, {"enable":true,"ip":"192.168.1.112"}))"}})));
  EXPECT_THAT(Get().log, ElementsAre("portforward: ip format isnt correct"));
}

TEST_F(DmzTest, SetOn_NoLanInterfaceFails) {
  for (const int count : {0, -1}) {
    Fresh();
    Get().results[kEnumerate] = count;
    Exchange exchange(Dmz(true, "192.168.1.112"));
    exchange.Run(SetDMZ);
    EXPECT_THAT(Get().calls, ElementsAreArray(Join({kReadBoth, {kEnumerate, exchange.Answer()}})));
    EXPECT_THAT(Get().log, ElementsAre("portforward: ip format isnt correct"));
  }
}

TEST_F(DmzTest, SetOn_AddressThatIsNoWholeTextFailsWithoutALook) {
  const std::string cut("192.168.1.112\0x", 15);
  for (const Json::Value &ip : {Json::Value(5), Json::Value(), Json::Value(true), Json::Value(Json::arrayValue),
                                Json::Value(Json::objectValue), Json::Value(cut)}) {
    Fresh();
    Exchange exchange(Dmz(true, ip));
    exchange.Run(SetDMZ);
    EXPECT_THAT(Get().calls,
                ElementsAreArray(Join({kReadBoth, {"SetError(4300, " + scripted::Text(Dmz(true, ip)) + ")"}})));
    EXPECT_THAT(Get().log, ElementsAre("portforward: ip format isnt correct"));
  }
}

TEST_F(DmzTest, SetOn_MissingAddressFails) {
  Exchange exchange(Dmz(true));
  exchange.Run(SetDMZ);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kReadEnable, {R"(SetError(4300, {"enable":true}))"}})));
  EXPECT_THAT(Get().log, ElementsAre("portforward: ip member required"));
}

TEST_F(DmzTest, SetOn_FailedMkdirWritesNothing) {
  Get().folders.clear();
  Get().results[kMkdir] = -1;
  Exchange exchange(Dmz(true, "192.168.1.112"));
  exchange.Run(SetDMZ);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join(
                               {kReadBoth, {kEnumerate, kLan, kIpInLan, kCheckFolder, kMkdir, exchange.Answer()}})));
  EXPECT_THAT(Get().log, ElementsAre("portforward: Failed to mkdir [/etc/portforward/routerpf]"));
}

TEST_F(DmzTest, SetOn_FailedWriteLeavesNoFile) {
  const std::string message = std::string("portforward: Failed to set value on file [") + kDmzFile + "]";
  const std::string failed = R"(SetError(4300, {"enable":true,"ip":"192.168.1.112"}))";
  const Lines before = Join({kReadBoth, {kEnumerate, kLan, kIpInLan, kCheckFolder, kSetEnabled}});
  Get().results = {{kSetEnabled, -1}};
  Exchange first(Dmz(true, "192.168.1.112"));
  first.Run(SetDMZ);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({before, {kUnlink, failed}})));
  EXPECT_THAT(Get().log, ElementsAre(message));
  Fresh();
  Get().results = {{kSetIp, -1}};
  Exchange second(Dmz(true, "192.168.1.112"));
  second.Run(SetDMZ);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({before, {kSetIp, kUnlink, failed}})));
  EXPECT_THAT(Get().log, ElementsAre(message));
}

TEST_F(DmzTest, SetOn_FailedRestartLeavesTheFile) {
  Get().results[kRestart] = 1;
  Exchange exchange(Dmz(true, "192.168.1.112"));
  exchange.Run(SetDMZ);
  EXPECT_EQ(exchange.Answer(), R"(SetError(4300, {"enable":true,"ip":"192.168.1.112"}))");
  EXPECT_THAT(Get().calls, Not(Contains(kUnlink)));
  EXPECT_THAT(Get().log, ElementsAre("portforward: Failed to execute rc network start-dnat"));
}

TEST_F(DmzTest, SetOff_RemovesTheFileAndRestarts) {
  Get().existingFiles = {kDmzFile};
  Exchange exchange(Dmz(false, "not looked at"));
  exchange.Run(SetDMZ);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kReadBoth, {kExists, kUnlink, kRestart, "SetSuccess(null)"}})));
}

TEST_F(DmzTest, SetOff_WithoutAFileRunsNothing) {
  Exchange exchange(Dmz(false));
  exchange.Run(SetDMZ);
  EXPECT_THAT(Get().calls, ElementsAreArray(Join({kReadEnable, {kExists, "SetSuccess(null)"}})));
}

TEST_F(DmzTest, SetOff_FileThatCannotBeRemovedAnswers4300) {
  Get().existingFiles = {kDmzFile};
  Get().results[kUnlink] = -1;
  Exchange exchange(Dmz(false));
  exchange.Run(SetDMZ);
  EXPECT_THAT(Get().calls,
              ElementsAreArray(Join({kReadEnable, {kExists, kUnlink, R"(SetError(4300, {"enable":false}))"}})));
}

TEST_F(DmzTest, SetOff_FailedRestartAnswers4300) {
  Get().existingFiles = {kDmzFile};
  Get().results[kRestart] = -1;
  Exchange exchange(Dmz(false));
  exchange.Run(SetDMZ);
  EXPECT_EQ(exchange.Answer(), R"(SetError(4300, {"enable":false}))");
  EXPECT_THAT(Get().log, ElementsAre("portforward: Failed to execute rc network start-dnat"));
}

TEST_F(DmzTest, Set_WithoutEnableFailsWithWhatTheRequestHad) {
  Json::Value parameters(Json::objectValue);
  Exchange none(parameters);
  none.Run(SetDMZ);
  EXPECT_THAT(Get().calls, ElementsAre("HasParam(enable)", "HasParam(ip)", "SetError(4300, {})"));
  parameters["ip"] = "192.168.1.112";
  parameters["other"] = 1;
  Exchange exchange(parameters);
  exchange.Run(SetDMZ);
  EXPECT_EQ(exchange.Answer(), R"(SetError(4300, {"ip":"192.168.1.112"}))");
  EXPECT_THAT(Get().log, ElementsAre("portforward: enable member required", "portforward: enable member required"));
}

TEST_F(DmzTest, Set_EnableIsConvertedAsTheJsonLibraryDoes) {
  for (const Json::Value &on : {Json::Value(1), Json::Value(-1), Json::Value(0.5)}) {
    Exchange exchange(Dmz(on, "192.168.1.112"));
    exchange.Run(SetDMZ);
    EXPECT_EQ(Get().calls[Get().calls.size() - 2], kRestart);
    EXPECT_EQ(exchange.Answer(), "SetSuccess(null)");
  }
  for (const Json::Value &off : {Json::Value(0), Json::Value(0.0), Json::Value()}) {
    Exchange exchange(Dmz(off));
    exchange.Run(SetDMZ);
    EXPECT_EQ(Get().calls[Get().calls.size() - 2], kExists);
    EXPECT_EQ(exchange.Answer(), "SetSuccess(null)");
  }
}

TEST_F(DmzTest, Set_EnableThatTheJsonLibraryCannotConvertAnswers4300) {
  for (const Json::Value &wrong :
       {Json::Value("true"), Json::Value(""), Json::Value(Json::arrayValue), Json::Value(Json::objectValue)}) {
    Get().existingFiles = {kDmzFile};
    Fresh();
    Exchange exchange(Dmz(wrong, "192.168.1.112"));
    exchange.Run(SetDMZ);
    EXPECT_THAT(Get().calls, ElementsAreArray(Join({kReadBoth, {exchange.Answer()}})));
    EXPECT_EQ(exchange.Answer(), "SetError(4300, " + scripted::Text(Dmz(wrong, "192.168.1.112")) + ")");
  }
}

// The LAN interfaces.

TEST_F(LocalLanTest, AnswersEveryInterfaceInOrder) {
  Exchange exchange;
  exchange.Run(GetLocalLan);
  EXPECT_THAT(Get().calls,
              ElementsAre(kEnumerate, kLan, kGuest,
                          R"(SetSuccess({"local_lan":[{"ip":"192.168.1.1","mask":"255.255.255.0","netif":"lbr0"},)"
                          R"({"ip":"192.168.2.1","mask":"255.255.255.0","netif":"gbr0"}]}))"));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(LocalLanTest, UnreadableInterfaceIsLoggedAndLeftOut) {
  Get().results[kLan] = -1;
  Exchange exchange;
  exchange.Run(GetLocalLan);
  EXPECT_EQ(exchange.Answer(),
            R"(SetSuccess({"local_lan":[{"ip":"192.168.2.1","mask":"255.255.255.0","netif":"gbr0"}]}))");
  EXPECT_THAT(Get().log, ElementsAre(kLanFault));
}

TEST_F(LocalLanTest, EveryInterfaceUnreadableIsAnEmptyListAndSuccess) {
  Get().results = {{kLan, -1}, {kGuest, -1}};
  Exchange exchange;
  exchange.Run(GetLocalLan);
  EXPECT_EQ(exchange.Answer(), R"(SetSuccess({"local_lan":[]}))");
}

TEST_F(LocalLanTest, NoInterfaceAnswers4300WithAnEmptyList) {
  for (const int count : {0, -1}) {
    Fresh();
    Get().results[kEnumerate] = count;
    Exchange exchange;
    exchange.Run(GetLocalLan);
    EXPECT_THAT(Get().calls, ElementsAre(kEnumerate, R"(SetError(4300, {"local_lan":[]}))"));
  }
}

TEST_F(LocalLanTest, ListsUpTo32Interfaces) {
  Get().lans.clear();
  for (int i = 0; i < 40; ++i) {
    Get().lans.push_back({"lan" + std::to_string(i), "192.168.1." + std::to_string(i), "255.255.255.255"});
  }
  Json::Value out;
  EXPECT_TRUE(PortForward().GetLocalLan(out));
  EXPECT_EQ(out["local_lan"].size(), 32U);
  EXPECT_EQ(out["local_lan"][31]["netif"], "lan31");
}

} // namespace
