#include "webapi/gate.h"

#include <gtest/gtest.h>

#include <vector>

using vornwebapi::Gate;
using vornwebapi::Turn;

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
  Gate gate(2, 1, 0, [](auto) {});
  EXPECT_EQ(gate.Enter({}, Waiter(1)), Gate::Entry::kAdmitted);
  EXPECT_EQ(gate.Enter({}, Waiter(2)), Gate::Entry::kAdmitted);
  EXPECT_EQ(gate.Enter({}, Waiter(3)), Gate::Entry::kQueued);
  EXPECT_EQ(gate.Enter({}, Waiter(4)), Gate::Entry::kFull);
}

TEST_F(GateTest, HandsASlotToTheFirstWhoWaits) {
  Gate gate(1, 2, 0, [this](std::function<void()> work) { posted_.push_back(std::move(work)); });
  gate.Enter({}, Waiter(1));
  gate.Enter({}, Waiter(2));
  gate.Enter({}, Waiter(3));
  gate.Leave({});
  EXPECT_TRUE(told_.empty()); // on another thread, not on that of the one who left
  RunPosted();
  EXPECT_EQ(told_, (std::vector<std::pair<int, bool>>{{2, true}}));
  EXPECT_EQ(gate.Enter({}, Waiter(4)), Gate::Entry::kQueued); // the slot went on, it was not free
  gate.Leave({});
  gate.Leave({});
  gate.Leave({});
  RunPosted();
  EXPECT_EQ(told_, (std::vector<std::pair<int, bool>>{{2, true}, {3, true}, {4, true}}));
  EXPECT_EQ(gate.Enter({}, Waiter(5)), Gate::Entry::kAdmitted);
}

TEST_F(GateTest, TurnsAwayWhoWaitsWhenItStops) {
  Gate gate(1, 2, 0, [this](std::function<void()> work) { posted_.push_back(std::move(work)); });
  gate.Enter({}, Waiter(1));
  gate.Enter({}, Waiter(2));
  gate.Stop();
  RunPosted();
  EXPECT_EQ(told_, (std::vector<std::pair<int, bool>>{{2, false}}));
  EXPECT_EQ(gate.Enter({}, Waiter(3)), Gate::Entry::kFull);
  gate.Leave({});
  RunPosted();
  EXPECT_EQ(told_.size(), 1U);
}

// Two groups, and more slots than are ever taken.
class TurnTest : public GateTest {
protected:
  static constexpr Turn kReads{0, false};
  static constexpr Turn kWrites{0, true};
  static constexpr Turn kWritesElsewhere{1, true};

  std::vector<int> LetIn() {
    RunPosted();
    std::vector<int> numbers;
    for (const auto &[number, admitted] : std::exchange(told_, {})) {
      EXPECT_TRUE(admitted);
      numbers.push_back(number);
    }
    return numbers;
  }

  Gate gate_{8, 8, 2, [this](std::function<void()> work) { posted_.push_back(std::move(work)); }};
};

TEST_F(TurnTest, WhoReadsIsInsideTogether) {
  for (int count = 0; count < 3; ++count) {
    EXPECT_EQ(gate_.Enter(kReads, Waiter(count)), Gate::Entry::kAdmitted);
  }
}

TEST_F(TurnTest, WhoWritesIsInsideAloneOfItsGroup) {
  EXPECT_EQ(gate_.Enter(kReads, Waiter(1)), Gate::Entry::kAdmitted);
  EXPECT_EQ(gate_.Enter(kReads, Waiter(2)), Gate::Entry::kAdmitted);
  EXPECT_EQ(gate_.Enter(kWrites, Waiter(3)), Gate::Entry::kQueued);
  EXPECT_EQ(gate_.Enter(kWritesElsewhere, Waiter(4)), Gate::Entry::kAdmitted);
  EXPECT_EQ(gate_.Enter({}, Waiter(5)), Gate::Entry::kAdmitted);
  gate_.Leave(kReads);
  EXPECT_EQ(LetIn(), std::vector<int>{});
  gate_.Leave(kReads);
  EXPECT_EQ(LetIn(), std::vector<int>{3});
  EXPECT_EQ(gate_.Enter(kReads, Waiter(6)), Gate::Entry::kQueued);
  EXPECT_EQ(gate_.Enter(kWrites, Waiter(7)), Gate::Entry::kQueued);
  gate_.Leave(kWrites);
  EXPECT_EQ(LetIn(), std::vector<int>{6});
  gate_.Leave(kReads);
  EXPECT_EQ(LetIn(), std::vector<int>{7});
}

TEST_F(TurnTest, NobodyPassesWhoWaitsOfItsGroup) {
  gate_.Enter(kReads, Waiter(1));
  EXPECT_EQ(gate_.Enter(kWrites, Waiter(2)), Gate::Entry::kQueued);
  EXPECT_EQ(gate_.Enter(kReads, Waiter(3)), Gate::Entry::kQueued); // else reading without end would keep the writer out
  EXPECT_EQ(gate_.Enter(kReads, Waiter(4)), Gate::Entry::kQueued);
  EXPECT_EQ(gate_.Enter(kWrites, Waiter(5)), Gate::Entry::kQueued);
  EXPECT_EQ(gate_.Enter(kReads, Waiter(6)), Gate::Entry::kQueued);
  gate_.Leave(kReads);
  EXPECT_EQ(LetIn(), std::vector<int>{2});
  gate_.Leave(kWrites);
  EXPECT_EQ(LetIn(), (std::vector<int>{3, 4}));
  gate_.Leave(kReads);
  EXPECT_EQ(LetIn(), std::vector<int>{});
  gate_.Leave(kReads);
  EXPECT_EQ(LetIn(), std::vector<int>{5});
  gate_.Leave(kWrites);
  EXPECT_EQ(LetIn(), std::vector<int>{6});
}

TEST_F(TurnTest, ATurnEndsBeforeItsSlot) {
  Gate gate(2, 8, 2, [this](std::function<void()> work) { posted_.push_back(std::move(work)); });
  gate.Enter(kWrites, Waiter(1));
  EXPECT_EQ(gate.Enter(kWrites, Waiter(2)), Gate::Entry::kQueued);
  gate.EndTurn(kWrites);
  EXPECT_EQ(LetIn(), std::vector<int>{2});
  EXPECT_EQ(gate.Enter(kWritesElsewhere, Waiter(3)), Gate::Entry::kQueued); // both slots are taken
  gate.LeaveSlot();
  EXPECT_EQ(LetIn(), std::vector<int>{3});
}

TEST_F(TurnTest, ASlotPassesWhoWaitsForATurn) {
  Gate gate(2, 8, 2, [this](std::function<void()> work) { posted_.push_back(std::move(work)); });
  gate.Enter(kWrites, Waiter(1));
  gate.Enter({}, Waiter(2));
  EXPECT_EQ(gate.Enter(kWrites, Waiter(3)), Gate::Entry::kQueued);
  EXPECT_EQ(gate.Enter(kWritesElsewhere, Waiter(4)), Gate::Entry::kQueued);
  gate.Leave({});
  EXPECT_EQ(LetIn(), std::vector<int>{4});
  gate.Leave(kWritesElsewhere);
  EXPECT_EQ(LetIn(), std::vector<int>{});
  gate.Leave(kWrites);
  EXPECT_EQ(LetIn(), std::vector<int>{3});
}

TEST_F(TurnTest, WhoWaitsForATurnIsTurnedAwayWhenItStops) {
  gate_.Enter(kWrites, Waiter(1));
  EXPECT_EQ(gate_.Enter(kReads, Waiter(2)), Gate::Entry::kQueued);
  gate_.Stop();
  RunPosted();
  EXPECT_EQ(told_, (std::vector<std::pair<int, bool>>{{2, false}}));
  EXPECT_EQ(gate_.Enter(kReads, Waiter(3)), Gate::Entry::kFull);
  gate_.Leave(kWrites);
  RunPosted();
  EXPECT_EQ(told_.size(), 1U);
}

} // namespace
