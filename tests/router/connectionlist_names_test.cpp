// Names of stations: from the last listing's file, and by NetBIOS.
#include "router/connectionlist.h"
#include "tests/router/network_files.h"
#include "tests/router/random_stations.h"
#include "tests/router/scripted_platform.h"

#include <gmock/gmock.h>

#include <sys/stat.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>

namespace fs = std::filesystem;

using scripted::Exchange;
using scripted::Get;
using scripted::kNameFile;
using scripted::Parse;
using scripted::PutNameFile;
using scripted::PutNetBiosReply;
using scripted::ReadNameFile;
using scripted::RemoveNameFile;
using scripted::TakeNmblookupCalls;
using scripted::Text;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

std::string popenFailsFor; // the part of a command that cannot be started
std::vector<std::string> commands;

} // namespace

// The linker puts these in the place of the module's calls of popen.
// NOLINTBEGIN(readability-identifier-naming)
extern "C" FILE *__real_popen(const char *command, const char *mode);
extern "C" FILE *__wrap_popen(const char *command, const char *mode);
extern "C" FILE *__wrap_popen(const char *command, const char *mode) {
  commands.push_back(std::string(mode) + " " + command);
  const bool fails = !popenFailsFor.empty() && commands.back().find(popenFailsFor) != std::string::npos;
  return fails ? nullptr : __real_popen(command, mode);
}
// NOLINTEND(readability-identifier-naming)

namespace {

constexpr char kCannotOpen[] = "connectionlist: could not open (/tmp/connectionlist.txt)";
constexpr char kReply[] = "Looking up status of 192.168.1.5\n"
                          "\tLAPTOP          <00> -         B <ACTIVE> \n"
                          "\tLAPTOP          <03> -         B <ACTIVE> \n"
                          "\tWORKGROUP       <00> - <GROUP> B <ACTIVE> \n"
                          "\tOLD             <20> -         B <CONFLICT> \n\n"
                          "\tMAC Address = 00-00-00-00-00-00\n";

std::string CommandFor(const std::string &ip) {
  return "/usr/bin/nmblookup -A " + ip +
         " \t\t\t| /bin/grep ACTIVE | /bin/grep -v GROUP | /usr/bin/awk {'print $1'} \t\t\t| /usr/bin/uniq | "
         "/usr/bin/xargs";
}

class NamesTest : public testing::Test {
protected:
  void SetUp() override {
    scripted::Reset();
    commands.clear();
    RemoveNameFile();
    scripted::PutNmblookup();
  }
  void TearDown() override { popenFailsFor.clear(); }

  static std::string Apply(const std::string &stations) {
    Json::Value result;
    result["stations"] = Parse(stations);
    ConnectionList().ApplyOldHostName(result);
    return Text(result["stations"]);
  }
  static Json::Value Update(Exchange &exchange, const std::string &stations) {
    static Json::Value result;
    result = Json::Value();
    result["stations"] = Parse(stations);
    exchange.Run(
        [](VORN::APIRequest *, VORN::APIResponse *response) { ConnectionList().UpdateHostName(result, response); });
    return result;
  }
  static std::string NameOf(const std::string &ip, std::string name, int expected = 0) {
    EXPECT_EQ(ConnectionList().GetNetBIOSNameByIP(ip, name), expected);
    return name;
  }
};

TEST_F(NamesTest, File_IsWrittenWithTabsAndSortedMembers) {
  ConnectionList().WriteDataToFile(Parse(R"({"stations":[{"mac":"m","ip":"i","hostname":"é\"<\u0001"},{}]})"));
  EXPECT_EQ(ReadNameFile(), "{\n\t\"stations\" : \n\t[\n\t\t{\n\t\t\t\"hostname\" : \"\\u00e9\\\"<\\u0001\",\n"
                            "\t\t\t\"ip\" : \"i\",\n\t\t\t\"mac\" : \"m\"\n\t\t},\n\t\t{}\n\t]\n}\n");
  ConnectionList().WriteDataToFile(Parse(R"({"stations":[]})"));
  EXPECT_EQ(ReadNameFile(), "{\n\t\"stations\" : []\n}\n");
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(NamesTest, File_IsReadBackAsItWasWritten) {
  const Json::Value listing = Parse(R"({"stations":[{"ip":"192.168.1.5","hostname":"tv","status":true,"n":-5}]})");
  ConnectionList().WriteDataToFile(listing);
  Json::Value read;
  ConnectionList().ReadDataFromFile(read);
  EXPECT_EQ(Text(read), Text(listing));
}

TEST_F(NamesTest, File_OnlyItsOwnerReads) {
  ConnectionList().WriteDataToFile(Json::Value());
  struct stat facts {};
  ASSERT_EQ(stat(kNameFile.c_str(), &facts), 0);
  EXPECT_EQ(facts.st_mode & 0777, 0600U);
}

TEST_F(NamesTest, File_MissingFileLeavesTheResultAndSaysNothing) {
  Json::Value read = Parse(R"({"stations":[]})");
  ConnectionList().ReadDataFromFile(read);
  EXPECT_EQ(Text(read), R"({"stations":[]})");
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(NamesTest, File_BrokenFileLeavesWhatTheReaderMadeOfIt) {
  PutNameFile(R"({"stations":[{"ip":"1"}])");
  Json::Value read;
  ConnectionList().ReadDataFromFile(read);
  EXPECT_EQ(Text(read), R"({"stations":[{"ip":"1"}]})");
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(NamesTest, File_TextThatTheReaderNeverSeesLeavesTheResult) {
  const std::string listing = R"({"stations":[{"ip":"1"}]})";
  PutNameFile(std::string(65, '[') + std::string(65, ']'));
  Json::Value read = Parse(listing);
  ConnectionList().ReadDataFromFile(read);
  EXPECT_EQ(Text(read), listing);
  PutNameFile(std::string("[1]\0", 4));
  ConnectionList().ReadDataFromFile(read);
  EXPECT_EQ(Text(read), listing);
  PutNameFile("[1]" + std::string(64 << 20, ' '));
  ConnectionList().ReadDataFromFile(read);
  EXPECT_EQ(Text(read), listing);
}

TEST_F(NamesTest, File_ThatCannotBeOpenedIsLogged) {
  fs::create_directory(kNameFile);
  ConnectionList().WriteDataToFile(Json::Value());
  EXPECT_THAT(Get().log, ElementsAre(kCannotOpen));
  Json::Value read;
  ConnectionList().ReadDataFromFile(read);
  EXPECT_EQ(Text(read), "null");
}

TEST_F(NamesTest, File_SymbolicLinkIsNeitherFollowedNorReplaced) {
  const std::string target = "/tmp/target";
  const std::string text = R"({"stations":[{"ip":"1","hostname":"tv"}]})";
  std::ofstream(target) << text;
  fs::create_symlink(target, kNameFile);
  ConnectionList().WriteDataToFile(Json::Value());
  EXPECT_THAT(Get().log, ElementsAre(kCannotOpen));
  std::ifstream file(target);
  EXPECT_EQ(std::string(std::istreambuf_iterator<char>(file), {}), text);
  EXPECT_EQ(Apply(R"([{"ip":"1"}])"), R"([{"ip":"1"}])");
}

TEST_F(NamesTest, File_PipeIsNotWaitedFor) {
  ASSERT_EQ(mkfifo(kNameFile.c_str(), 0600), 0);
  ConnectionList().WriteDataToFile(Json::Value());
  EXPECT_THAT(Get().log, ElementsAre(kCannotOpen));
  EXPECT_EQ(Apply(R"([{"ip":"1"}])"), R"([{"ip":"1"}])");
}

TEST_F(NamesTest, Old_MissingNamesComeFromTheAddress) {
  PutNameFile(R"({"stations":[{"ip":"1","hostname":"one"},{"ip":"2","hostname":"two"}]})");
  EXPECT_EQ(Apply(R"([{"hostname":"","ip":"2"},{"hostname":"?","ip":"1"},{"ip":"1"},{"hostname":"","ip":"11"}])"),
            R"([{"hostname":"two","ip":"2"},{"hostname":"one","ip":"1"},{"hostname":"one","ip":"1"},)"
            R"({"hostname":"","ip":"11"}])");
}

TEST_F(NamesTest, Old_StationThatHasANameKeepsIt) {
  PutNameFile(R"({"stations":[{"ip":"1","hostname":"one"}]})");
  EXPECT_EQ(Apply(R"([{"hostname":"mine","ip":"1"},{"hostname":"??","ip":"1"},{"hostname":" ","ip":"1"}])"),
            R"([{"hostname":"mine","ip":"1"},{"hostname":"??","ip":"1"},{"hostname":" ","ip":"1"}])");
}

TEST_F(NamesTest, Old_FirstRecordOfTheAddressDecides) {
  PutNameFile(R"({"stations":[{"ip":"1","hostname":"?"},{"ip":"1","hostname":"one"},{"ip":"2"},
                              {"ip":"2","hostname":"two"},{"ip":"3","hostname":"a"},{"ip":"3","hostname":"b"}]})");
  EXPECT_EQ(Apply(R"([{"hostname":"","ip":"1"},{"hostname":"?","ip":"2"},{"hostname":"","ip":"3"}])"),
            R"([{"hostname":"","ip":"1"},{"hostname":"?","ip":"2"},{"hostname":"a","ip":"3"}])");
}

TEST_F(NamesTest, Old_StationsWithoutAnAddressMatchTheFirstRecordWithoutOne) {
  PutNameFile(R"({"stations":[{"ip":"1","hostname":"one"},{"hostname":"none"},{"ip":"","hostname":"other"}]})");
  EXPECT_EQ(Apply(R"([{"ip":""},{"hostname":"?"}])"), R"([{"hostname":"none","ip":""},{"hostname":"none"}])");
}

TEST_F(NamesTest, Old_OddFilesGiveNoNames) {
  const std::string stations = R"([{"hostname":"?","ip":"1"},{"hostname":""}])";
  for (const std::string &file :
       {std::string(), std::string("null"), std::string("[]"), std::string("{}"), std::string("\"text\""),
        std::string(R"({"stations":{}})"), std::string(R"({"stations":{"a":{"ip":"1","hostname":"one"}}})"),
        std::string(R"({"stations":[null,7,[],"x"]})"), std::string(R"({"stations":"x"})"), std::string("\0\0", 2),
        std::string(R"({"stations":[{"ip":"1","hostname":["one"]}]})"), std::string(100000, '['),
        R"({"stations":)" + std::string(100000, '[') + std::string(100000, ']') + "}",
        R"({"a":{)" + std::string(100000, '{'), std::string("\xff\xfe")}) {
    PutNameFile(file);
    EXPECT_EQ(Apply(stations), stations) << file.substr(0, 60);
  }
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(NamesTest, Old_FileCutAnywhereGivesNoNames) {
  const std::string whole = R"({"stations":[{"hostname":"one","ip":"1"},{"hostname":"two","ip":"2"}]})";
  const std::string stations = R"([{"hostname":"","ip":"1"},{"hostname":"","ip":""}])";
  for (size_t length = 0; length < whole.size(); ++length) {
    PutNameFile(whole.substr(0, length));
    EXPECT_EQ(Apply(stations), stations) << length;
  }
  PutNameFile(whole);
  EXPECT_EQ(Apply(stations), R"([{"hostname":"one","ip":"1"},{"hostname":"","ip":""}])");
}

TEST_F(NamesTest, Old_LargeFileIsRead) {
  std::string file = R"({"stations":[{"ip":"0","hostname":")" + std::string(10 << 20, 'x') + "\"}";
  for (int i = 1; i < 20000; ++i) {
    file += R"(,{"ip":")" + std::to_string(i) + R"(","hostname":"n)" + std::to_string(i) + "\"}";
  }
  PutNameFile(file + "]}");
  EXPECT_EQ(Apply(R"([{"ip":"19999"}])"), R"([{"hostname":"n19999","ip":"19999"}])");
}

TEST_F(NamesTest, Old_FileWithoutEndIsNotRead) {
  PutNameFile("");
  fs::resize_file(kNameFile, uintmax_t{1} << 40); // takes no room
  EXPECT_EQ(Apply(R"([{"ip":"1"}])"), R"([{"ip":"1"}])");
  ConnectionList().WriteDataToFile(Parse(R"({"stations":[]})"));
  EXPECT_EQ(ReadNameFile(), "{\n\t\"stations\" : []\n}\n");
}

TEST_F(NamesTest, Old_NothingToNameReadsNothing) {
  PutNameFile(R"({"stations":[{"ip":"","hostname":"x"}]})");
  EXPECT_EQ(Apply("[]"), "[]");
}

// As it reads: for each station without a name, a search of the old list.
void ApplyPlainly(Json::Value &stations, const Json::Value &old) {
  for (Json::Value &station : stations) {
    const std::string name = station.get("hostname", "").asString();
    if (name != "?" && !name.empty()) {
      continue;
    }
    for (const Json::Value &record : old) {
      if (record.get("ip", "").asString() == station.get("ip", "").asString()) {
        const std::string oldName = record.get("hostname", "").asString();
        if (oldName != "?" && !oldName.empty()) {
          station["hostname"] = oldName;
        }
        break;
      }
    }
  }
}

TEST_F(NamesTest, Old_RandomListsComeOutAsBySearch) {
  scripted::RandomStations random(3);
  for (int round = 0; round < 3000; ++round) {
    const Json::Value stations = random.List();
    Json::Value old;
    old["stations"] = random.List();
    PutNameFile(Text(old));
    Json::Value expected = stations;
    ApplyPlainly(expected, old["stations"]);
    ASSERT_EQ(Apply(Text(stations)), Text(expected)) << round << " " << Text(old);
  }
}

TEST_F(NamesTest, NetBios_RunsThePipelineAndTakesTheUniqueName) {
  PutNetBiosReply("192.168.1.5", kReply);
  EXPECT_EQ(NameOf("192.168.1.5", "old"), "LAPTOP");
  EXPECT_THAT(commands, ElementsAre("r " + CommandFor("192.168.1.5")));
  EXPECT_THAT(TakeNmblookupCalls(), ElementsAre("-A|192.168.1.5"));
}

TEST_F(NamesTest, NetBios_NameOfOneLetterIsOne) {
  PutNetBiosReply("1", "\tX <00> - B <ACTIVE>\n");
  EXPECT_EQ(NameOf("1", "old"), "X");
}

TEST_F(NamesTest, NetBios_DifferentNamesAreJoinedWithBlanks) {
  PutNetBiosReply("1", "\tONE <00> - B <ACTIVE>\n\tTWO <20> - B <ACTIVE>\n\tONE <03> - B <ACTIVE>\n");
  EXPECT_EQ(NameOf("1", ""), "ONE TWO ONE"); // only neighbours are the same
}

TEST_F(NamesTest, NetBios_SilentHostLeavesTheName) {
  EXPECT_EQ(NameOf("192.168.1.6", "old"), "old");
  PutNetBiosReply("192.168.1.7", "Looking up status of 192.168.1.7\nNo reply from 192.168.1.7\n\n");
  EXPECT_EQ(NameOf("192.168.1.7", "old"), "old");
}

TEST_F(NamesTest, NetBios_LongLineIsCut) {
  PutNetBiosReply("1", std::string(2000, 'x') + " <00> - B <ACTIVE>\n");
  EXPECT_EQ(NameOf("1", ""), std::string(1022, 'x'));
}

TEST_F(NamesTest, NetBios_LongCommandIsCut) {
  NameOf(std::string(1100, '1'), "old");
  EXPECT_THAT(commands,
              ElementsAre("r /usr/bin/nmblookup -A " + std::string(1023 - std::strlen("/usr/bin/nmblookup -A "), '1')));
}

TEST_F(NamesTest, NetBios_MarkupAndControlCharactersAreNamesToo) {
  PutNetBiosReply("1", "<b>\x01$(id);`id` <00> - B <ACTIVE>\n");
  EXPECT_EQ(NameOf("1", ""), "<b>\x01$(id);`id`");
}

TEST_F(NamesTest, NetBios_NameThatThePipelineDoesNotTakeLeavesTheOldOne) {
  setenv("LC_ALL", "C.UTF-8", 1);                    // grep passes broken UTF-8 over
  for (const char *name : {"caf\xe9\xff", "it's"}) { // xargs, a quotation mark without its other one
    PutNetBiosReply("1", std::string(name) + " <00> - B <ACTIVE>\n");
    EXPECT_EQ(NameOf("1", "old"), "old") << name;
  }
  unsetenv("LC_ALL");
}

TEST_F(NamesTest, NetBios_CommandThatCannotBeStartedFails) {
  popenFailsFor = "nmblookup";
  EXPECT_EQ(NameOf("192.168.1.5", "old", -1), "old");
  EXPECT_THAT(Get().log, ElementsAre("connectionlist: Failed to execute cmd [" + CommandFor("192.168.1.5") + "]"));
}

TEST_F(NamesTest, NetBios_AddressThatTheShellWouldSeeCutIsNotAsked) {
  EXPECT_EQ(NameOf(std::string("192.168.1.5\0;x", 13), "old", -1), "old");
  EXPECT_THAT(commands, IsEmpty());
}

TEST_F(NamesTest, Update_AnswersAfterEachStationAndWritesTheFile) {
  PutNetBiosReply("192.168.1.5", kReply);
  PutNetBiosReply("192.168.1.7", "\tNAS <00> - B <ACTIVE>\n");
  Exchange exchange;
  const Json::Value result = Update(
      exchange,
      R"([{"hostname":"old","ip":"192.168.1.5"},{"hostname":"cached","ip":"192.168.1.6"},{"ip":"192.168.1.7"}])");
  const std::string first = R"(SetSuccess({"stations":[{"hostname":"LAPTOP","ip":"192.168.1.5"},)";
  EXPECT_THAT(
      exchange.Answers(),
      ElementsAre(first + R"({"hostname":"cached","ip":"192.168.1.6"},{"ip":"192.168.1.7"}]}))",
                  first + R"({"hostname":"cached","ip":"192.168.1.6"},{"ip":"192.168.1.7"}]}))",
                  first + R"({"hostname":"cached","ip":"192.168.1.6"},{"hostname":"NAS","ip":"192.168.1.7"}]}))"));
  EXPECT_THAT(TakeNmblookupCalls(), ElementsAre("-A|192.168.1.5", "-A|192.168.1.6", "-A|192.168.1.7"));
  EXPECT_EQ(Text(Parse(ReadNameFile())), Text(result));
  EXPECT_THAT(Get().log, IsEmpty());
}

TEST_F(NamesTest, Update_StationWithoutAnAddressIsAskedByAnEmptyOne) {
  Exchange exchange;
  Update(exchange, R"([{"mac":"m"}])");
  EXPECT_THAT(TakeNmblookupCalls(), ElementsAre("-A"));
  EXPECT_THAT(commands, ElementsAre("r " + CommandFor("")));
}

TEST_F(NamesTest, Update_FailedQueryIsLoggedAndNotAnswered) {
  popenFailsFor = "192.168.1.5";
  PutNetBiosReply("192.168.1.6", "\tNAS <00> - B <ACTIVE>\n");
  Exchange exchange;
  Update(exchange, R"([{"ip":"192.168.1.5"},{"ip":"192.168.1.6"}])");
  EXPECT_THAT(exchange.Answers(),
              ElementsAre(R"(SetSuccess({"stations":[{"ip":"192.168.1.5"},{"hostname":"NAS","ip":"192.168.1.6"}]}))"));
  EXPECT_THAT(Get().log, ElementsAre("connectionlist: Failed to execute cmd [" + CommandFor("192.168.1.5") + "]",
                                     "connectionlist: Failed to get net bios name with ip (192.168.1.5)"));
}

TEST_F(NamesTest, Update_EmptyListAnswersOnceAndWritesTheFile) {
  PutNameFile("old");
  Exchange exchange;
  Update(exchange, "[]");
  EXPECT_THAT(exchange.Answers(), ElementsAre(R"(SetSuccess({"stations":[]}))"));
  EXPECT_EQ(ReadNameFile(), "{\n\t\"stations\" : []\n}\n");
  EXPECT_THAT(commands, IsEmpty());
}

TEST_F(NamesTest, Update_FileThatCannotBeWrittenCostsNothingElse) {
  fs::create_directory(kNameFile);
  Exchange exchange;
  Update(exchange, R"([{"ip":"192.168.1.5"}])");
  EXPECT_EQ(exchange.AnswerCount(), 1U);
  EXPECT_THAT(Get().log, ElementsAre(kCannotOpen));
}

} // namespace
