#include "host/utility/program_runner.h"

#include "host/utility/error.h"
#include "host/utility/log.h"
#include "host/utility/output_log.h"
#include "host/utility/unique_fd.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>

namespace vornhost {

namespace {

using std::chrono::milliseconds;
using std::chrono::steady_clock;

bool IsRootsAlone(const struct stat &info) {
  const bool othersMayWrite = (info.st_mode & (S_IWGRP | S_IWOTH)) != 0;
  const bool guarded = S_ISDIR(info.st_mode) && (info.st_mode & S_ISVTX) != 0;
  return info.st_uid == 0 && (!othersMayWrite || guarded);
}

// Every step of the way is checked, so that nobody can change afterwards what the path means.
bool IsTrusted(const std::string &path) {
  for (size_t end = path.find('/', 1);; end = path.find('/', end + 1)) {
    const std::string step = path.substr(0, end);
    struct stat info {};
    if (lstat(step.c_str(), &info) != 0 || !IsRootsAlone(info)) {
      return false;
    }
    if (end == std::string::npos) {
      struct stat root {};
      return S_ISREG(info.st_mode) && lstat("/", &root) == 0 && IsRootsAlone(root);
    }
  }
}

std::vector<std::string> Environment() {
  std::vector<std::string> out = {"PATH=/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin", "LANG=C"};
  if (const char *zone = std::getenv("TZ"); zone != nullptr) {
    out.push_back(std::string("TZ=") + zone);
  }
  return out;
}

std::vector<char *> Pointers(std::vector<std::string> &texts) {
  std::vector<char *> out;
  out.reserve(texts.size() + 1);
  for (std::string &text : texts) {
    out.push_back(text.data());
  }
  out.push_back(nullptr);
  return out;
}

// The attributes and actions of posix_spawn, freed together. A step fails only for want of memory.
class SpawnPlan {
public:
  SpawnPlan() {
    posix_spawn_file_actions_init(&actions);
    posix_spawnattr_init(&attributes);
  }
  SpawnPlan(const SpawnPlan &) = delete;
  SpawnPlan &operator=(const SpawnPlan &) = delete;
  ~SpawnPlan() {
    posix_spawn_file_actions_destroy(&actions);
    posix_spawnattr_destroy(&attributes);
  }
  int Fill(int output) {
    sigset_t all;
    sigset_t none;
    sigfillset(&all);
    sigemptyset(&none);
    const std::array steps = {
        posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0),
        posix_spawn_file_actions_adddup2(&actions, output, STDOUT_FILENO),
        posix_spawn_file_actions_adddup2(&actions, output, STDERR_FILENO),
        posix_spawn_file_actions_addclosefrom_np(&actions, STDERR_FILENO + 1),
        posix_spawnattr_setsigdefault(&attributes, &all),
        posix_spawnattr_setsigmask(&attributes, &none),
        posix_spawnattr_setpgroup(&attributes, 0),
        posix_spawnattr_setflags(&attributes, POSIX_SPAWN_SETSIGDEF | POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETPGROUP),
    };
    const auto *bad = std::find_if(steps.begin(), steps.end(), [](int step) { return step != 0; });
    return bad == steps.end() ? 0 : *bad;
  }

  posix_spawn_file_actions_t actions{};
  posix_spawnattr_t attributes{};
};

// The write end must not be one of the descriptors that it is about to become.
int MakePipe(UniqueFd &readEnd, UniqueFd &writeEnd) {
  std::array<int, 2> ends{};
  if (pipe2(ends.data(), O_CLOEXEC) != 0) {
    return SetErrno(errno);
  }
  readEnd.Reset(ends[0]);
  writeEnd.Reset(ends[1]);
  if (writeEnd.Get() <= STDERR_FILENO) {
    writeEnd.Reset(fcntl(writeEnd.Get(), F_DUPFD_CLOEXEC, STDERR_FILENO + 1));
  }
  if (!writeEnd.IsOpen() || fcntl(readEnd.Get(), F_SETFL, O_NONBLOCK) != 0) {
    return SetErrno(errno);
  }
  return 0;
}

// A child that is ours to end and to reap.
class Child {
public:
  Child() = default;
  Child(const Child &) = delete;
  Child &operator=(const Child &) = delete;
  ~Child() {
    if (pid_ > 0) {
      Kill();
      int status = 0;
      Reap(status);
    }
  }

  int Start(const std::string &path, std::vector<std::string> arguments, int output) {
    std::vector<std::string> environment = Environment();
    SpawnPlan plan;
    int failed = plan.Fill(output);
    if (failed == 0) {
      failed = posix_spawn(&pid_, path.c_str(), &plan.actions, &plan.attributes, Pointers(arguments).data(),
                           Pointers(environment).data());
    }
    if (failed != 0) {
      pid_ = 0;
      LogError("%s cannot be started: %s", LogText(path).c_str(), std::strerror(failed));
      return SetError(QARDC_ERR_EXEC);
    }
    // By number: glibc 2.36 declares pidfd_open for C only.
    end_.Reset(static_cast<int>(syscall(SYS_pidfd_open, pid_, 0))); // close-on-exec by itself
    return end_.IsOpen() ? 0 : SetErrno(errno);
  }

  /// Readable once the child has ended.
  int EndFd() const { return end_.Get(); }

  /// The whole group. Before Reap only: until then no other process can have this number.
  void Kill() const { kill(-pid_, SIGKILL); }

  bool Reap(int &status) {
    pid_t got = 0;
    do {
      got = waitpid(pid_, &status, 0);
    } while (got < 0 && errno == EINTR);
    pid_ = 0;
    return got > 0;
  }

private:
  pid_t pid_ = 0;
  UniqueFd end_;
};

// @return false when the pipe has no writer any more
bool Drain(int pipe, OutputLog &log) {
  std::array<char, 65536> buffer{};
  for (int round = 0; round < 64; ++round) { // the caller looks at the clock in between
    const ssize_t got = read(pipe, buffer.data(), buffer.size());
    if (got <= 0) {
      return got < 0 && (errno == EAGAIN || errno == EINTR);
    }
    log.Take({buffer.data(), static_cast<size_t>(got)});
  }
  return true;
}

// @return false at the time limit
bool WaitForEnd(const Child &child, int pipe, milliseconds limit, OutputLog &log) {
  const auto deadline = steady_clock::now() + limit;
  std::array<pollfd, 2> wait = {{{child.EndFd(), POLLIN, 0}, {pipe, POLLIN, 0}}};
  for (;;) {
    const auto left = std::chrono::ceil<milliseconds>(deadline - steady_clock::now()).count();
    if (left <= 0) {
      return false;
    }
    if (poll(wait.data(), wait.size(), static_cast<int>(std::min<long>(left, INT_MAX))) < 0 && errno != EINTR) {
      return false;
    }
    if (wait[1].revents != 0 && !Drain(pipe, log)) {
      wait[1].fd = -1; // poll passes it over
      wait[1].revents = 0;
    }
    if (wait[0].revents != 0) {
      Drain(pipe, log);
      return true;
    }
  }
}

int Judge(const std::string &program, int status, int *exitStatus) {
  if (exitStatus != nullptr && WIFEXITED(status)) {
    *exitStatus = WEXITSTATUS(status);
  }
  if (WIFEXITED(status) && WEXITSTATUS(status) == 0) {
    return 0;
  }
  const bool ended = WIFEXITED(status);
  LogError("%s ended with %s %d", LogText(program).c_str(), ended ? "status" : "signal",
           ended ? WEXITSTATUS(status) : WTERMSIG(status));
  return SetError(QARDC_ERR_EXEC);
}

} // namespace

int FindProgram(const std::string &program, std::string &path) {
  if (program.empty() || program.front() != '/') {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  std::array<char, PATH_MAX> resolved{};
  if (realpath(program.c_str(), resolved.data()) == nullptr) {
    return SetErrno(errno);
  }
  path = resolved.data();
  return IsTrusted(path) ? 0 : SetError(QARDC_ERR_ACCESS);
}

int ProgramRunner::Run(const std::vector<std::string> &arguments, int *status) const {
  if (status != nullptr) {
    *status = -1;
  }
  std::string path;
  if (arguments.empty()) {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  const std::string &program = arguments.front();
  if (FindProgram(program, path) != 0) {
    LogError("%s is not run: error 0x%04X", LogText(program).c_str(), static_cast<unsigned>(QARDCErrGet()));
    return -1;
  }
  UniqueFd readEnd;
  UniqueFd writeEnd;
  Child child;
  if (MakePipe(readEnd, writeEnd) != 0 || child.Start(path, arguments, writeEnd.Get()) != 0) {
    return -1;
  }
  writeEnd.Reset();
  OutputLog log(program, limits_);
  const bool inTime = WaitForEnd(child, readEnd.Get(), limits_.time, log);
  if (!inTime) {
    child.Kill();
  }
  log.Finish();
  int waitStatus = 0;
  if (!child.Reap(waitStatus)) {
    return SetErrno(errno);
  }
  if (!inTime) {
    LogError("%s did not end in %lld ms and was killed", LogText(program).c_str(),
             static_cast<long long>(limits_.time.count()));
    return SetError(QARDC_ERR_TIMEOUT);
  }
  return Judge(program, waitStatus, status);
}

std::vector<std::string> SplitWords(const std::string &text) {
  std::vector<std::string> words;
  constexpr const char *kBlanks = " \t\n";
  for (size_t at = text.find_first_not_of(kBlanks); at != std::string::npos;) {
    const size_t end = text.find_first_of(kBlanks, at);
    words.push_back(text.substr(at, end == std::string::npos ? end : end - at));
    at = text.find_first_not_of(kBlanks, end);
  }
  return words;
}

} // namespace vornhost
