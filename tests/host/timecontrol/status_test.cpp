// "status" in the API, the program's hourly run and its --status give the same answer.
#include "host/schedule/local_time.h"
#include "host/timecontrol/rules.h"
#include "router/parental.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <ctime>

namespace {

// The zones stand a quarter of an hour and more apart, so that many slots of the week are the present one.
TEST(Status, IsWhatTheFirewallIsToldInEveryZone) {
  const ParentalHandler parental;
  for (int quarter = -48; quarter <= 56; ++quarter) {
    char zone[32];
    std::snprintf(zone, sizeof(zone), "<x>%d:%02d", quarter / 4, std::abs(quarter % 4) * 15);
    setenv("TZ", zone, 1);
    const int slot = vornhost::SlotOf(std::time(nullptr));
    ASSERT_GE(slot, 0);
    for (const size_t length : {0UL, static_cast<size_t>(slot), static_cast<size_t>(slot) + 1, 167UL, 168UL, 169UL}) {
      for (const char mark : {'0', '1', 'x'}) {
        const std::string schedule(length, mark);
        const bool cut = !vornhost::CutIn(slot, {{"02:00:00:00:00:01", "n", schedule}}).empty();
        const bool status = parental.GetScheduleNowStatus(schedule.c_str());
        if (vornhost::SlotOf(std::time(nullptr)) != slot) {
          continue; // the hour has just passed
        }
        EXPECT_EQ(status, cut) << zone << " " << length << " " << mark;
        EXPECT_EQ(cut, length > static_cast<size_t>(slot) && mark == '1');
      }
    }
  }
  unsetenv("TZ");
}

} // namespace
