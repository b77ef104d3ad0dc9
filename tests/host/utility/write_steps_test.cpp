// A change of a file, ended or failed at each of its system calls. A traced child makes the change; the test kills it
// at its n-th stop, or lets the n-th call fail.
#include "platform/utility.h"
#include "tests/host/files.h"
#include "tests/host/traced_child.h"

#include <gmock/gmock.h>

#include <sys/ptrace.h>
#include <sys/user.h>
#include <sys/wait.h>

#include <cerrno>

namespace {

using hosttest::TracedChild;
using testing::AnyOf;
using testing::ElementsAre;

constexpr const char *kFolder = "/var/lib/steps";
constexpr const char *kPath = "/var/lib/steps/file.conf";
constexpr const char *kFresh = "a=1\nk=new\nz=26\n";

enum class Old { kPresent, kAbsent };

std::string OldContent(Old old) {
  return old == Old::kPresent ? "a=1\nk=old\nz=26\n" : "<no file>";
}

std::string NewContent(Old old) {
  return old == Old::kPresent ? kFresh : "k=new\n";
}

void Prepare(Old old) {
  hosttest::FreshFolder(kFolder);
  if (old == Old::kPresent) {
    hosttest::WriteText(kPath, OldContent(old));
  }
}

int Change() {
  return QARDCFileSetKeyValue(kPath, "k", "new", "%s=%s\n");
}

class WriteSteps : public testing::TestWithParam<Old> {};

INSTANTIATE_TEST_SUITE_P(Over, WriteSteps, testing::Values(Old::kPresent, Old::kAbsent),
                         [](const auto &over) { return over.param == Old::kPresent ? "AnOldFile" : "NoFile"; });

TEST_P(WriteSteps, KilledAtAnyStepTheFileIsWhole) {
  int stops = 0;
  int kept = 0;
  int changed = 0;
  for (bool ended = false; !ended; ++stops) {
    Prepare(GetParam());
    TracedChild child(Change);
    for (int step = 0; step <= stops && !ended; ++step) {
      ended = !child.Step();
    }
    if (!ended) {
      child.Kill();
    }
    const std::string content = hosttest::ReadText(kPath);
    ASSERT_THAT(content, AnyOf(OldContent(GetParam()), NewContent(GetParam()))) << "stop " << stops;
    if (child.WasAcknowledged()) {
      ASSERT_EQ(content, NewContent(GetParam())) << "stop " << stops;
    }
    (content == NewContent(GetParam()) ? changed : kept) += 1;
    // The next writer finds its way, whatever was left.
    ASSERT_EQ(QARDCFileSetKeyValue(kPath, "next", "1", "%s=%s\n"), 0);
    ASSERT_THAT(hosttest::NamesIn(kFolder), ElementsAre("file.conf"));
  }
  RecordProperty("stops", stops);
  EXPECT_GT(kept, 15);
  EXPECT_GT(changed, 5);
}

// Registers differ by machine; and the thread sanitizer makes calls of its own, for ever when they fail.
#if defined(__x86_64__) && !defined(__SANITIZE_THREAD__)
// Lets the call that the child is about to make fail.
// @return false when the child ended in it
bool FailThisCall(TracedChild &child, int error) {
  user_regs_struct registers{};
  ptrace(PTRACE_GETREGS, child.Pid(), nullptr, &registers);
  registers.orig_rax = static_cast<unsigned long long>(-1);
  ptrace(PTRACE_SETREGS, child.Pid(), nullptr, &registers);
  if (!child.Step()) {
    return false;
  }
  ptrace(PTRACE_GETREGS, child.Pid(), nullptr, &registers);
  registers.rax = static_cast<unsigned long long>(-error);
  ptrace(PTRACE_SETREGS, child.Pid(), nullptr, &registers);
  return true;
}

struct Outcome {
  int failures = 0;
  int successes = 0;
};

// @return false when the change ended before its `failing`-th call
bool FailOne(Old old, int failing, int error, Outcome &outcome) {
  Prepare(old);
  TracedChild child(Change);
  for (int call = 0; call < failing; ++call) { // entry and exit of each call before
    if (!child.Step() || !child.Step()) {
      return false;
    }
  }
  if (!child.Step()) {
    return false;
  }
  FailThisCall(child, error);
  while (child.Step()) {
  }
  // Status 3: the call that failed was the acknowledging itself.
  const bool acknowledged = child.WasAcknowledged() || (WIFEXITED(child.Status()) && WEXITSTATUS(child.Status()) == 3);
  (acknowledged ? outcome.successes : outcome.failures) += 1;
  EXPECT_EQ(hosttest::ReadText(kPath), acknowledged ? NewContent(old) : OldContent(old)) << "call " << failing;
  if (!acknowledged) {
    const auto names = hosttest::NamesIn(kFolder);
    EXPECT_EQ(names.size(), old == Old::kPresent ? 1U : 0U) << "call " << failing;
  }
  return true;
}

TEST_P(WriteSteps, AnyOneFailingCallLeavesTheOldFileOrIsMadeGood) {
  for (const int error : {EIO, ENOSPC}) {
    Outcome outcome;
    int failing = 0;
    while (FailOne(GetParam(), failing, error, outcome)) {
      ++failing;
      ASSERT_FALSE(HasFailure());
    }
    RecordProperty("calls", failing);
    EXPECT_GT(outcome.failures, 8); // each call up to the folder's fsync matters
  }
}
#endif

} // namespace
