// When something that dies again and again may be started.
#include "host/watch/back_off.h"

#include <gtest/gtest.h>

#include <vector>

namespace {

using std::chrono::seconds;
using vornhost::BackOff;

// The pauses that starts one after the other, each as soon as it may be, have between them.
std::vector<long> PausesOf(BackOff &backOff, BackOff::Clock::time_point now, int starts) {
  std::vector<long> pauses;
  for (int start = 0; start < starts; ++start) {
    backOff.Note(now);
    pauses.push_back(std::chrono::duration_cast<seconds>(backOff.GetNext() - now).count());
    now = backOff.GetNext();
  }
  return pauses;
}

TEST(BackOff, FirstStartIsAtOnce) {
  EXPECT_LE(BackOff().GetNext(), BackOff::Clock::now());
}

TEST(BackOff, PausesDoubleUpToTheLongest) {
  BackOff backOff;
  EXPECT_EQ(PausesOf(backOff, BackOff::Clock::now(), 9), std::vector<long>({1, 2, 4, 8, 16, 32, 60, 60, 60}));
}

TEST(BackOff, WhatHasLastedBeginsAnew) {
  BackOff backOff;
  const auto now = BackOff::Clock::now();
  PausesOf(backOff, now, 9);
  EXPECT_EQ(PausesOf(backOff, now + seconds(1000), 2), std::vector<long>({1, 2}));
}

TEST(BackOff, WhatHasAlmostLastedDoesNot) {
  BackOff backOff;
  const auto now = BackOff::Clock::now();
  backOff.Note(now);
  backOff.Note(now + BackOff::kLasting - seconds(1));
  EXPECT_EQ(backOff.GetNext(), now + BackOff::kLasting + seconds(1));
}

} // namespace
