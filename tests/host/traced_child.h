// A child that makes one change, stopped before and after each of its system calls, so that a test can end it anywhere.
#ifndef TESTS_HOST_TRACED_CHILD_H
#define TESTS_HOST_TRACED_CHILD_H

#include "host/utility/unique_fd.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/ptrace.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>

namespace hosttest {

class TracedChild {
public:
  /// @param[in] change  run in the child; 0 is acknowledged with one byte, and is the child's status then. Status 1:
  /// the
  ///                    change failed; 3: the acknowledging did
  explicit TracedChild(int (*change)()) {
    int ends[2];
    EXPECT_EQ(pipe2(ends, O_CLOEXEC | O_NONBLOCK), 0);
    read_.Reset(ends[0]);
    vornhost::UniqueFd writeEnd(ends[1]);
    pid_ = fork();
    if (pid_ == 0) {
      Change(change, writeEnd.Get());
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
  [[noreturn]] static void Change(int (*change)(), int acknowledge) {
    ptrace(PTRACE_TRACEME, 0, nullptr, nullptr);
    raise(SIGSTOP);
    const int result = change();
    if (result == 0 && write(acknowledge, "y", 1) != 1) {
      _exit(3);
    }
    _exit(result == 0 ? 0 : 1);
  }

  bool Wait() { return waitpid(pid_, &status_, 0) == pid_ && WIFSTOPPED(status_); }

  pid_t pid_ = 0;
  int status_ = 0;
  vornhost::UniqueFd read_;
};

} // namespace hosttest

#endif
