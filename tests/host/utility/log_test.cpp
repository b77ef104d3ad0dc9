#include "host/utility/log.h"

#include "tests/host/utility/syslog_record.h"

#include <gmock/gmock.h>

namespace {

using testing::ElementsAre;

TEST(Log, WritesOneLineOfItsLevel) {
  vornhost::LogError("%s failed with %d", "that", 7);
  vornhost::LogInfo("told");
  EXPECT_THAT(hosttest::TakeLogLines(), ElementsAre("3 that failed with 7", "6 told"));
}

TEST(Log, AForeignTextIsNoFormat) {
  vornhost::LogError("name: %s", vornhost::LogText("%n%s%n").c_str());
  EXPECT_THAT(hosttest::TakeLogLines(), ElementsAre("3 name: %n%s%n"));
}

TEST(LogText, CannotForgeALine) {
  EXPECT_EQ(vornhost::LogText("a\nJan 1 forged\r\x1b[31m\xc3\xa4\x7f z"), "a?Jan 1 forged??[31m??? z");
  EXPECT_EQ(vornhost::LogText(std::string(300, 'x')), std::string(200, 'x'));
  EXPECT_EQ(vornhost::LogText(std::string("a\0b", 3)), "a?b");
}

} // namespace
