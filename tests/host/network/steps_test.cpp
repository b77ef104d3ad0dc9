#include "host/network/topology_steps.h"

#include <gmock/gmock.h>

#include <stdexcept>

namespace {

using testing::ElementsAre;
using vornhost::StepSequence;
using Outcome = vornhost::StepSequence::Outcome;

class Steps : public testing::Test {
protected:
  void Add(const std::string &name, bool fails = false, bool undoFails = false) {
    sequence_.Add(
        name, [this, name, fails] { Note("do " + name, fails); },
        [this, name, undoFails] { Note("undo " + name, undoFails); });
  }
  void Note(const std::string &what, bool fails) {
    done_.push_back(what);
    if (fails) {
      throw std::runtime_error(what);
    }
  }

  StepSequence sequence_;
  std::vector<std::string> done_;
};

TEST_F(Steps, AllAreDoneInOrder) {
  Add("a");
  Add("b");
  EXPECT_EQ(sequence_.Run(), Outcome::kDone);
  EXPECT_THAT(done_, ElementsAre("do a", "do b"));
}

TEST_F(Steps, NoneIsDone) {
  EXPECT_EQ(sequence_.Run(), Outcome::kDone);
}

TEST_F(Steps, FirstFails) {
  Add("a", true);
  Add("b");
  EXPECT_EQ(sequence_.Run(), Outcome::kUndone);
  EXPECT_THAT(done_, ElementsAre("do a", "undo a"));
}

TEST_F(Steps, MiddleFailsAndAllBeforeAreUndoneLastFirst) {
  Add("a");
  Add("b");
  Add("c", true);
  Add("d");
  EXPECT_EQ(sequence_.Run(), Outcome::kUndone);
  EXPECT_THAT(done_, ElementsAre("do a", "do b", "do c", "undo c", "undo b", "undo a"));
}

TEST_F(Steps, FailingUndoDoesNotKeepTheOthersFromRunning) {
  Add("a");
  Add("b", false, true);
  Add("c", true);
  EXPECT_EQ(sequence_.Run(), Outcome::kHalfDone);
  EXPECT_THAT(done_, ElementsAre("do a", "do b", "do c", "undo c", "undo b", "undo a"));
}

} // namespace
