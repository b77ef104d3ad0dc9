// A change of a file, ended or failed at each of its system calls. A traced child makes the change; the test stops it
// at its n-th stop (a system call has two: before and after) and kills it there, or lets the n-th call fail.
#include "host/utility/unique_fd.h"
#include "platform/utility.h"
#include "tests/host/files.h"

#include <gmock/gmock.h>

#include <fcntl.h>
#include <sys/ptrace.h>
#include <sys/syscall.h>
#include <sys/user.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <string>
#include <vector>

namespace {

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

// The child. It acknowledges the change with one byte.
[[noreturn]] void ChangeTraced(int acknowledge) {
  ptrace(PTRACE_TRACEME, 0, nullptr, nullptr);
  raise(SIGSTOP);
  const int result = QARDCFileSetKeyValue(kPath, "k", "new", "%s=%s\n");
  if (result == 0 && write(acknowledge, "y", 1) != 1) {
    _exit(3);
  }
  _exit(result == 0 ? 0 : 1);
}

class TracedChange {
public:
  TracedChange() {
    int ends[2];
    EXPECT_EQ(pipe2(ends, O_CLOEXEC | O_NONBLOCK), 0);
    read_.Reset(ends[0]);
    vornhost::UniqueFd writeEnd(ends[1]);
    pid_ = fork();
    if (pid_ == 0) {
      ChangeTraced(writeEnd.Get());
    }
    Wait();
    ptrace(PTRACE_SETOPTIONS, pid_, nullptr, PTRACE_O_TRACESYSGOOD | PTRACE_O_EXITKILL);
  }

  /// Runs on to the next stop.
  /// @return false when the child has ended
  bool Step() {
    ptrace(PTRACE_SYSCALL, pid_, nullptr, nullptr);
    return Wait();
  }

  void Kill() {
    kill(pid_, SIGKILL);
    while (Wait()) {
    }
  }

  pid_t Pid() const { return pid_; }
  int Status() const { return status_; }
  bool WasAcknowledged() const {
    char byte = 0;
    return read(read_.Get(), &byte, 1) == 1;
  }

private:
  bool Wait() { return waitpid(pid_, &status_, 0) == pid_ && WIFSTOPPED(status_); }

  pid_t pid_ = 0;
  int status_ = 0;
  vornhost::UniqueFd read_;
};

class WriteSteps : public testing::TestWithParam<Old> {};

INSTANTIATE_TEST_SUITE_P(Over, WriteSteps, testing::Values(Old::kPresent, Old::kAbsent),
                         [](const auto &over) { return over.param == Old::kPresent ? "AnOldFile" : "NoFile"; });

TEST_P(WriteSteps, KilledAtAnyStepTheFileIsWhole) {
  int stops = 0;
  int kept = 0;
  int changed = 0;
  for (bool ended = false; !ended; ++stops) {
    Prepare(GetParam());
    TracedChange child;
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

#if defined(__x86_64__) // registers differ by machine
// A call of the change: the `nth` one, from 0, of this number. Not simply its place among all calls, which the memory
// allocator's own calls shift from one run to the next.
struct Call {
  long number;
  int nth;
};

// Runs on until the child is about to make that call.
// @return false when the child ended without it
bool RunTo(TracedChange &child, const Call &call) {
  int met = 0;
  while (child.Step()) {
    __ptrace_syscall_info info{};
    ptrace(PTRACE_GET_SYSCALL_INFO, child.Pid(), sizeof(info), &info);
    auto number = static_cast<long>(info.entry.nr);
    if (number == SYS_fstat) { // which of the two it is, is the C library's choice
      number = SYS_newfstatat;
    }
    if (info.op == PTRACE_SYSCALL_INFO_ENTRY && number == call.number && met++ == call.nth) {
      return true;
    }
  }
  return false;
}

// Lets the call that the child is about to make fail.
void FailThisCall(TracedChange &child, int error) {
  user_regs_struct registers{};
  ptrace(PTRACE_GETREGS, child.Pid(), nullptr, &registers);
  registers.orig_rax = static_cast<unsigned long long>(-1);
  ptrace(PTRACE_SETREGS, child.Pid(), nullptr, &registers);
  if (child.Step()) {
    ptrace(PTRACE_GETREGS, child.Pid(), nullptr, &registers);
    registers.rax = static_cast<unsigned long long>(-error);
    ptrace(PTRACE_SETREGS, child.Pid(), nullptr, &registers);
  }
}

enum class Outcome { kNoSuchCall, kRefused, kDone };

Outcome FailOne(Old old, const Call &call, int error) {
  Prepare(old);
  TracedChange child;
  if (!RunTo(child, call)) {
    return Outcome::kNoSuchCall;
  }
  FailThisCall(child, error);
  while (child.Step()) {
  }
  // Status 3: the call that failed was the acknowledging itself.
  const bool done = child.WasAcknowledged() || (WIFEXITED(child.Status()) && WEXITSTATUS(child.Status()) == 3);
  EXPECT_EQ(hosttest::ReadText(kPath), done ? NewContent(old) : OldContent(old));
  if (!done) {
    EXPECT_EQ(hosttest::NamesIn(kFolder).size(), old == Old::kPresent ? 1U : 0U);
  }
  return done ? Outcome::kDone : Outcome::kRefused;
}

// How often a call is made, and how often the change was refused because it failed.
struct Kind {
  const char *name;
  long number;
  int made;
  int refused;
};

std::vector<Kind> KindsOver(Old old) {
  if (old == Old::kAbsent) {
    return {{"openat", SYS_openat, 3, 3}, {"flock", SYS_flock, 1, 1},     {"unlinkat", SYS_unlinkat, 1, 1},
            {"fchmod", SYS_fchmod, 1, 1}, {"write", SYS_write, 2, 1},     {"fsync", SYS_fsync, 2, 2},
            {"close", SYS_close, 2, 1},   {"rename", SYS_renameat2, 1, 1}};
  }
  return {{"openat", SYS_openat, 3, 3},     {"flock", SYS_flock, 1, 1},
          {"fstat", SYS_newfstatat, 2, 2},  {"read", SYS_read, 2, 2},
          {"unlinkat", SYS_unlinkat, 2, 1}, // of what a killed writer left; of the old file
          {"fchown", SYS_fchown, 1, 1},     {"fchmod", SYS_fchmod, 1, 1},
          {"write", SYS_write, 2, 1}, // the new file; the acknowledgement
          {"fsync", SYS_fsync, 2, 2}, // the new file; the folder
          {"close", SYS_close, 3, 1}, // the new file; the old file and the folder, after which nothing can be lost
          {"rename", SYS_renameat2, 1, 1}};
}

TEST_P(WriteSteps, AnyOneFailingCallLeavesTheOldFileOrIsMadeGood) {
  for (const Kind &kind : KindsOver(GetParam())) {
    for (const int error : {EIO, ENOSPC}) {
      SCOPED_TRACE(std::string(kind.name) + ", error " + std::to_string(error));
      int made = 0;
      int refused = 0;
      for (auto outcome = FailOne(GetParam(), {kind.number, made}, error); outcome != Outcome::kNoSuchCall;
           outcome = FailOne(GetParam(), {kind.number, made}, error)) {
        ++made;
        refused += outcome == Outcome::kRefused ? 1 : 0;
      }
      EXPECT_EQ(made, kind.made);
      EXPECT_EQ(refused, kind.refused);
    }
  }
}
#endif

} // namespace
