#include "tests/webapi/webapi_fixture.h"
#include "webapi/config.h"

#include <fstream>

using vornwebapi::Config;
using vornwebapi::DescribeKeys;
using vornwebapi::ReadConfig;
using vornwebapi::Start;

namespace {

Start Read(std::vector<const char *> words, Config &config, std::string &fault) {
  words.insert(words.begin(), {"vornwebd", "--module", "m.so"});
  return ReadConfig(static_cast<int>(words.size()), words.data(), config, fault);
}

TEST(Config, HasTheDocumentedDefaults) {
  Config config;
  std::string fault;
  ASSERT_EQ(Read({"--config", "/dev/null"}, config, fault), Start::kServe) << fault;
  EXPECT_EQ(config.module, "m.so");
  EXPECT_EQ(config.listen, "127.0.0.1:8080");
  EXPECT_EQ(config.slots, 16U);
  EXPECT_EQ(config.queue, 64U);
  EXPECT_EQ(config.connectionsPerAddress, 64U);
  EXPECT_EQ(config.tlsConnections, 512U);
  EXPECT_EQ(config.requestLineBytes, 8192U);
  EXPECT_EQ(config.headerBytes, 8192U);
  EXPECT_EQ(config.headerFields, 100U);
  EXPECT_EQ(config.bodyBytes, 1048576U);
  EXPECT_EQ(config.jsonDepth, 64U);
  EXPECT_EQ(config.headerTime, std::chrono::seconds(10));
  EXPECT_EQ(config.bodyTime, std::chrono::seconds(15));
  EXPECT_EQ(config.idleTime, std::chrono::seconds(15));
  EXPECT_EQ(config.writeTime, std::chrono::seconds(15));
  EXPECT_EQ(config.stopTime, std::chrono::seconds(5));
  EXPECT_EQ(config.tasks, 8U);
  EXPECT_EQ(config.taskKeepTime, std::chrono::minutes(5));
  EXPECT_FALSE(config.logToStandardError);
}

TEST(Config, ReadsEachKindOfValue) {
  Config config;
  std::string fault;
  ASSERT_EQ(Read({"--config=/dev/null", "--slots=3", "--idle-time", "2m", "--write-time", "20ms", "--log-stderr", "yes",
                  "--host-names", "router.lan router"},
                 config, fault),
            Start::kServe)
      << fault;
  EXPECT_EQ(config.slots, 3U);
  EXPECT_EQ(config.idleTime, std::chrono::minutes(2));
  EXPECT_EQ(config.writeTime, std::chrono::milliseconds(20));
  EXPECT_TRUE(config.logToStandardError);
  EXPECT_EQ(config.hostNames, "router.lan router");
}

TEST(Config, RefusesAWrongValueAndNamesIt) {
  const std::vector<std::pair<std::vector<const char *>, std::string>> kCases = {
      {{"--slots", ""}, "slots: \"\" is no number"},
      {{"--slots", "-1"}, "slots: \"-1\" is no number"},
      {{"--slots", "257"}, "slots: \"257\" is not within 1 to 256"},
      {{"--slots", "99999999999999999999"}, "slots: \"99999999999999999999\" is no number"},
      {{"--json-depth", "65"}, "json-depth: \"65\" is not within 1 to 64"},
      {{"--idle-time", "1ms"}, "idle-time: \"1ms\" is not within 10 to 86400000 ms"},
      {{"--idle-time", "99999999999m"}, "idle-time: \"99999999999m\" is no time such as 500ms, 10s or 5m"},
      {{"--idle-time", "s"}, "idle-time: \"s\" is no time such as 500ms, 10s or 5m"},
      {{"--log-stderr", "1"}, "log-stderr: \"1\" is neither yes nor no"},
      {{"--nothing", "1"}, "unknown key \"nothing\""},
  };
  for (const auto &[words, says] : kCases) {
    Config config;
    std::string fault;
    EXPECT_EQ(Read(words, config, fault), Start::kRefused);
    EXPECT_EQ(fault, says);
  }
}

TEST(Config, AFileCannotNameAFile) {
  const vorntest::Folder folder;
  std::ofstream(folder.Path("a")) << "config=/dev/null\n";
  Config config;
  std::string fault;
  EXPECT_EQ(Read({"--config", folder.Path("a").c_str()}, config, fault), Start::kRefused);
  EXPECT_EQ(fault, folder.Path("a") + ":1: unknown key \"config\"");
}

TEST(Config, HelpNamesEveryKeyWithItsDefault) {
  Config config;
  std::string fault;
  EXPECT_EQ(Read({"--help"}, config, fault), Start::kHelp);
  const std::string text = DescribeKeys();
  for (const char *line :
       {"  slots                     ", "(16)", "  idle-time ", "(15000ms)", "  listen ", "  help "}) {
    EXPECT_NE(text.find(line), std::string::npos) << line;
  }
}

} // namespace
