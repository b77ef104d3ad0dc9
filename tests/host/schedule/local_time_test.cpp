#include "host/schedule/local_time.h"
#include "platform/schedule.h"
#include "tests/host/schedule/utc.h"

#include <gtest/gtest.h>

#include <cstdlib>

namespace {

using hosttest::Utc;
using vornhost::SlotOf;

constexpr int kSunday = 0;
constexpr int kMonday = 24;
constexpr int kSaturday = 6 * 24;

void SetZone(const char *zone) {
  setenv("TZ", zone, 1);
}

class LocalTime : public testing::Test {
protected:
  void TearDown() override {
    unsetenv("TZ");
    tzset();
  }
};

TEST_F(LocalTime, CountsFromSundayMidnight) {
  SetZone("UTC");
  EXPECT_EQ(SlotOf(Utc(3, 3, 0, 0)), kSunday);
  EXPECT_EQ(SlotOf(Utc(3, 3, 0, 59, 59)), kSunday);
  EXPECT_EQ(SlotOf(Utc(3, 3, 1, 0)), kSunday + 1);
  EXPECT_EQ(SlotOf(Utc(3, 4, 0, 0)), kMonday);
  EXPECT_EQ(SlotOf(Utc(3, 9, 23, 59, 59)), kSaturday + 23);
  for (int hour = 0; hour < vornhost::kSlots; ++hour) {
    EXPECT_EQ(SlotOf(Utc(3, 3, 0, 30) + hour * 3600), hour);
  }
}

TEST_F(LocalTime, IsLocalInZonesFarFromUtcAndBetweenTheHours) {
  SetZone("Pacific/Auckland"); // UTC+13 in March
  EXPECT_EQ(SlotOf(Utc(3, 3, 10, 59)), kSunday + 23);
  EXPECT_EQ(SlotOf(Utc(3, 3, 11, 0)), kMonday);
  SetZone("America/Los_Angeles"); // UTC-8
  EXPECT_EQ(SlotOf(Utc(3, 4, 7, 59)), kSunday + 23);
  EXPECT_EQ(SlotOf(Utc(3, 4, 8, 0)), kMonday);
  SetZone("Asia/Kathmandu"); // UTC+5:45
  EXPECT_EQ(SlotOf(Utc(3, 3, 18, 14)), kSunday + 23);
  EXPECT_EQ(SlotOf(Utc(3, 3, 18, 15)), kMonday);
}

TEST_F(LocalTime, TheHourThatSpringLeavesOutIsNoSlotOfThatDay) {
  SetZone("Europe/Berlin"); // 31 March, 02:00 becomes 03:00, at 01:00 UTC
  EXPECT_EQ(SlotOf(Utc(3, 31, 0, 59, 59)), kSunday + 1);
  EXPECT_EQ(SlotOf(Utc(3, 31, 1, 0)), kSunday + 3);
  EXPECT_EQ(SlotOf(Utc(3, 31, 1, 59, 59)), kSunday + 3);
  EXPECT_EQ(SlotOf(Utc(3, 31, 2, 0)), kSunday + 4);
}

TEST_F(LocalTime, TheHourThatAutumnRepeatsIsTheSameSlotTwice) {
  SetZone("Europe/Berlin"); // 27 October, 03:00 becomes 02:00, at 01:00 UTC
  EXPECT_EQ(SlotOf(Utc(10, 26, 23, 59, 59)), kSunday + 1);
  EXPECT_EQ(SlotOf(Utc(10, 27, 0, 0)), kSunday + 2);
  EXPECT_EQ(SlotOf(Utc(10, 27, 1, 0)), kSunday + 2);
  EXPECT_EQ(SlotOf(Utc(10, 27, 1, 59, 59)), kSunday + 2);
  EXPECT_EQ(SlotOf(Utc(10, 27, 2, 0)), kSunday + 3);
}

TEST_F(LocalTime, AHalfHoursChangeIsFollowedToo) {
  SetZone("Australia/Lord_Howe"); // 7 April, 02:00 becomes 01:30, at 15:00 UTC of the 6th
  EXPECT_EQ(SlotOf(Utc(4, 6, 14, 59)), kSunday + 1);
  EXPECT_EQ(SlotOf(Utc(4, 6, 15, 29)), kSunday + 1);
  EXPECT_EQ(SlotOf(Utc(4, 6, 15, 30)), kSunday + 2);
}

TEST_F(LocalTime, ANewZoneCountsAtOnce) {
  SetZone("UTC");
  EXPECT_EQ(SlotOf(Utc(3, 3, 12, 0)), kSunday + 12);
  SetZone("Asia/Tokyo");
  EXPECT_EQ(SlotOf(Utc(3, 3, 12, 0)), kSunday + 21);
}

TEST_F(LocalTime, AClockThatWasNeverSetHasNoSlot) {
  SetZone("UTC");
  EXPECT_EQ(SlotOf(0), -1);
  EXPECT_EQ(SlotOf(-1), -1);
  EXPECT_EQ(SlotOf(946684800), -1); // 2000, where many clocks begin
  EXPECT_EQ(SlotOf(1735689599), -1) << "the last second of 2024";
}

TEST_F(LocalTime, TheContractsFunctionTellsThePresentSlot) {
  SetZone("Europe/Berlin");
  const int before = SlotOf(std::time(nullptr));
  const int told = VORNSchedGetNowIndex();
  const int after = SlotOf(std::time(nullptr));
  EXPECT_TRUE(told == before || told == after) << told;
  EXPECT_GE(told, 0);
}

} // namespace
