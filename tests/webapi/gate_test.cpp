#include "webapi/gate.h"

#include <gtest/gtest.h>

#include <vector>

using vornwebapi::Gate;

namespace {

class GateTest : public testing::Test {
protected:
  auto Waiter(int number) {
    return [this, number] { return [this, number](bool admitted) { told_.emplace_back(number, admitted); }; };
  }
  void RunPosted() {
    for (auto &work : std::exchange(posted_, {})) {
      work();
    }
  }

  std::vector<std::function<void()>> posted_;
  std::vector<std::pair<int, bool>> told_;
};

TEST_F(GateTest, AdmitsAsManyAsItHasSlotsThenQueuesThenRefuses) {
  Gate gate(2, 1, [](auto) {});
  EXPECT_EQ(gate.Enter(Waiter(1)), Gate::Entry::kAdmitted);
  EXPECT_EQ(gate.Enter(Waiter(2)), Gate::Entry::kAdmitted);
  EXPECT_EQ(gate.Enter(Waiter(3)), Gate::Entry::kQueued);
  EXPECT_EQ(gate.Enter(Waiter(4)), Gate::Entry::kFull);
}

TEST_F(GateTest, HandsASlotToTheFirstWhoWaits) {
  Gate gate(1, 2, [this](std::function<void()> work) { posted_.push_back(std::move(work)); });
  gate.Enter(Waiter(1));
  gate.Enter(Waiter(2));
  gate.Enter(Waiter(3));
  gate.Leave();
  EXPECT_TRUE(told_.empty()); // on another thread, not on that of the one who left
  RunPosted();
  EXPECT_EQ(told_, (std::vector<std::pair<int, bool>>{{2, true}}));
  EXPECT_EQ(gate.Enter(Waiter(4)), Gate::Entry::kQueued); // the slot went on, it was not free
  gate.Leave();
  gate.Leave();
  gate.Leave();
  RunPosted();
  EXPECT_EQ(told_, (std::vector<std::pair<int, bool>>{{2, true}, {3, true}, {4, true}}));
  EXPECT_EQ(gate.Enter(Waiter(5)), Gate::Entry::kAdmitted);
}

TEST_F(GateTest, TurnsAwayWhoWaitsWhenItStops) {
  Gate gate(1, 2, [this](std::function<void()> work) { posted_.push_back(std::move(work)); });
  gate.Enter(Waiter(1));
  gate.Enter(Waiter(2));
  gate.Stop();
  RunPosted();
  EXPECT_EQ(told_, (std::vector<std::pair<int, bool>>{{2, false}}));
  EXPECT_EQ(gate.Enter(Waiter(3)), Gate::Entry::kFull);
  gate.Leave();
  RunPosted();
  EXPECT_EQ(told_.size(), 1U);
}

} // namespace
