#include "host/utility/log.h"
#include "host/utility/program_runner.h"
#include "host/utility/unique_fd.h"
#include "platform/utility.h"
#include "tests/host/files.h"
#include "tests/host/utility/syslog_record.h"

#include <gmock/gmock.h>

#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <thread>

namespace {

using hosttest::ReadText;
using hosttest::TakeLogLines;
using std::chrono::milliseconds;
using std::chrono::steady_clock;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

constexpr const char *kShell = "/bin/sh";

class Exec : public testing::Test {
protected:
  void SetUp() override {
    if (hosttest::StatOf("/").st_uid != 0) {
      GTEST_SKIP() << "needs root: in a user's own namespace the system's programs do not belong to root";
    }
    hosttest::FreshFolder("/usr/lib/exectest");
    std::filesystem::copy_file(EXEC_PROBE, "/usr/lib/exectest/probe");
    TakeLogLines();
  }

  static std::string Script(const std::string &name, const std::string &body) {
    std::string path = "/usr/lib/exectest/" + name;
    hosttest::WriteText(path, "#!/bin/sh\n" + body + "\n");
    chmod(path.c_str(), 0755);
    return path;
  }

  static std::string Probed() { return ReadText("/tmp/probed"); }

  static int RunLimited(const std::string &body, milliseconds limit) {
    vornhost::RunLimits limits;
    limits.time = limit;
    return vornhost::ProgramRunner(limits).Run({kShell, "-c", body});
  }

  static constexpr const char *kProbe = "/usr/lib/exectest/probe";
};

bool FailedWith(int result, int code) {
  return result < 0 && QARDCErrGet() == code;
}

TEST_F(Exec, TheExitStatusDecides) {
  EXPECT_EQ(QARDCExec("/bin/true", nullptr, nullptr, nullptr, nullptr), 0);
  EXPECT_THAT(TakeLogLines(), IsEmpty());
  EXPECT_TRUE(FailedWith(QARDCExec("/bin/false", nullptr, nullptr, nullptr, nullptr), QARDC_ERR_EXEC));
  EXPECT_THAT(TakeLogLines(), ElementsAre("3 /bin/false ended with status 1"));
  EXPECT_TRUE(FailedWith(QARDCExec(kShell, "-c", "exit 255", nullptr, nullptr), QARDC_ERR_EXEC));
  EXPECT_TRUE(FailedWith(QARDCExec(kShell, "-c", "kill -TERM $$", nullptr, nullptr), QARDC_ERR_EXEC));
  EXPECT_THAT(TakeLogLines(), ElementsAre("3 /bin/sh ended with status 255", "3 /bin/sh ended with signal 15"));
}

TEST_F(Exec, ArgumentsArriveByteForByte) {
  const std::string odd = " a'b\"c\\d\n$(id) `id` ;|&<>*?~#! \xc3\xa4\xff\t";
  ASSERT_EQ(QARDCExec(kProbe, "/tmp/probed", odd.c_str(), "", "-x y"), 0);
  EXPECT_THAT(Probed(), HasSubstr("argument </usr/lib/exectest/probe>\nargument <" + odd +
                                  ">\nargument <>\nargument <-x y>\ndescriptors "));
}

TEST_F(Exec, TheFirstNullEndsTheArguments) {
  ASSERT_EQ(QARDCExec(kProbe, "/tmp/probed", "one", nullptr, "not this"), 0);
  EXPECT_THAT(Probed(), HasSubstr("argument <one>\ndescriptors "));
}

TEST_F(Exec, AProgramTextWithBlanksIsTakenApart) {
  ASSERT_EQ(QARDCExec("  /usr/lib/exectest/probe /tmp/probed   --flag 'x ", "b c", nullptr, nullptr, nullptr), 0);
  EXPECT_THAT(Probed(), HasSubstr("probe>\nargument <--flag>\nargument <'x>\nargument <b c>\ndescriptors "));
}

TEST_F(Exec, ExeclTakesAnyNumberOfArguments) {
  ASSERT_EQ(QARDCExecl(kProbe, 187, "/tmp/probed", "1", "2", "3", "4", "5", "6 6", nullptr), 0);
  EXPECT_THAT(Probed(), HasSubstr("<1>\nargument <2>\nargument <3>\nargument <4>\nargument <5>\nargument <6 6>\nd"));
  EXPECT_EQ(QARDCExecl("/bin/true", 0, nullptr), 0);
  EXPECT_TRUE(FailedWith(QARDCExecl(kShell, 187, "-c", "exit 3", nullptr), QARDC_ERR_EXEC));
}

TEST_F(Exec, TheProgramStartsClean) {
  const vornhost::UniqueFd leaked(open("/etc/passwd", O_RDONLY)); // NOLINT(android-cloexec-open): the point
  const vornhost::UniqueFd high(dup2(leaked.Get(), 200));
  ASSERT_GE(high.Get(), 0);
  sigset_t blocked;
  sigset_t old;
  sigemptyset(&blocked);
  sigaddset(&blocked, SIGTERM);
  sigaddset(&blocked, SIGCHLD);
  pthread_sigmask(SIG_BLOCK, &blocked, &old);
  signal(SIGPIPE, SIG_IGN);
  setenv("LD_LIBRARY_PATH", "/tmp/evil", 1);
  setenv("SECRET", "value", 1);
  setenv("TZ", "Europe/Berlin", 1);
  const int result = QARDCExec(kProbe, "/tmp/probed", nullptr, nullptr, nullptr);
  signal(SIGPIPE, SIG_DFL);
  pthread_sigmask(SIG_SETMASK, &old, nullptr);
  for (const char *name : {"LD_LIBRARY_PATH", "SECRET", "TZ"}) {
    unsetenv(name);
  }
  ASSERT_EQ(result, 0);
  EXPECT_EQ(Probed(), "argument </usr/lib/exectest/probe>\n"
                      "descriptors 0 1 2 \n"
                      "signals \n"
                      "leader 1\n"
                      "input /dev/null\n"
                      "environment PATH=/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin\n"
                      "environment LANG=C\n"
                      "environment TZ=Europe/Berlin\n");
}

TEST_F(Exec, LeavesNoDescriptorAndNoChildBehind) {
  const auto before = hosttest::NamesIn("/proc/self/fd").size();
  for (int round = 0; round < 5; ++round) {
    QARDCExec("/bin/true", nullptr, nullptr, nullptr, nullptr);
    QARDCExec("/bin/false", nullptr, nullptr, nullptr, nullptr);
    QARDCExec("/usr/lib/exectest/absent", nullptr, nullptr, nullptr, nullptr);
    RunLimited("sleep 10", milliseconds(10));
  }
  EXPECT_EQ(hosttest::NamesIn("/proc/self/fd").size(), before);
  EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1);
}

TEST_F(Exec, WhatIsNoProgramIsNotRun) {
  const auto run = [](const char *program) { return QARDCExec(program, nullptr, nullptr, nullptr, nullptr); };
  EXPECT_TRUE(FailedWith(run(nullptr), QARDC_ERR_BAD_ARGUMENT));
  EXPECT_TRUE(FailedWith(run(""), QARDC_ERR_BAD_ARGUMENT));
  EXPECT_TRUE(FailedWith(run("  "), QARDC_ERR_BAD_ARGUMENT));
  EXPECT_TRUE(FailedWith(QARDCExec("", "/bin/true", nullptr, nullptr, nullptr), QARDC_ERR_BAD_ARGUMENT));
  EXPECT_TRUE(FailedWith(QARDCExecl(" ", 187, "/bin/true", nullptr), QARDC_ERR_BAD_ARGUMENT));
  EXPECT_TRUE(FailedWith(run("true"), QARDC_ERR_BAD_ARGUMENT));
  EXPECT_TRUE(FailedWith(run("./true"), QARDC_ERR_BAD_ARGUMENT));
  EXPECT_TRUE(FailedWith(QARDCExecl(nullptr, 187, nullptr), QARDC_ERR_BAD_ARGUMENT));
  TakeLogLines();
  EXPECT_TRUE(FailedWith(run("/usr/lib/exectest/absent"), QARDC_ERR_NOT_FOUND));
  EXPECT_THAT(TakeLogLines(), ElementsAre("3 /usr/lib/exectest/absent is not run: error 0x0300"));
  EXPECT_TRUE(FailedWith(run("/usr/lib/exectest"), QARDC_ERR_ACCESS));
  hosttest::WriteText("/usr/lib/exectest/plain", "text");
  EXPECT_TRUE(FailedWith(run("/usr/lib/exectest/plain"), QARDC_ERR_EXEC));
  const std::string noInterpreter = Script("nointerpreter", "");
  hosttest::WriteText(noInterpreter, "#!/absent/interpreter\n");
  EXPECT_TRUE(FailedWith(run(noInterpreter.c_str()), QARDC_ERR_EXEC));
}

TEST_F(Exec, AProgramThatOthersMayChangeIsNotRun) {
  const std::string path = Script("script", "echo ran > /tmp/ran");
  const auto run = [&path] { return QARDCExec(path.c_str(), nullptr, nullptr, nullptr, nullptr); };
  for (const mode_t mode : {0775U, 0757U, 0777U}) {
    chmod(path.c_str(), mode);
    EXPECT_TRUE(FailedWith(run(), QARDC_ERR_ACCESS)) << mode;
  }
  chmod(path.c_str(), 0755);
  if (chown(path.c_str(), 65534, 0) == 0) { // not in a user namespace of one user
    EXPECT_TRUE(FailedWith(run(), QARDC_ERR_ACCESS));
    ASSERT_EQ(chown(path.c_str(), 0, 0), 0);
  }
  chmod("/usr/lib/exectest", 0777);
  EXPECT_TRUE(FailedWith(run(), QARDC_ERR_ACCESS));
  EXPECT_EQ(QARDCFileExist("/tmp/ran"), 0);
  chmod("/usr/lib/exectest", 0755);
  EXPECT_EQ(run(), 0);
  EXPECT_EQ(ReadText("/tmp/ran"), "ran\n");
}

TEST_F(Exec, ALinkIsJudgedByWhatItPointsTo) {
  const std::string script = Script("script", "exit 0");
  ASSERT_EQ(symlink(script.c_str(), "/usr/lib/exectest/link"), 0);
  EXPECT_EQ(QARDCExec("/usr/lib/exectest/link", nullptr, nullptr, nullptr, nullptr), 0);
  chmod(script.c_str(), 0777);
  EXPECT_TRUE(FailedWith(QARDCExec("/usr/lib/exectest/link", nullptr, nullptr, nullptr, nullptr), QARDC_ERR_ACCESS));
}

TEST_F(Exec, TheStickyTmpIsGoodEnough) {
  const std::string script = Script("script", "exit 0");
  std::filesystem::copy_file(script, "/tmp/script");
  EXPECT_EQ(QARDCExec("/tmp/script", nullptr, nullptr, nullptr, nullptr), 0);
}

TEST_F(Exec, OutputAndErrorsGoToTheLogLineByLine) {
  ASSERT_EQ(QARDCExec(kShell, "-c", "echo one; echo two >&2; printf 'esc\\033[1m\\n\\nno end'", nullptr, nullptr), 0);
  EXPECT_THAT(TakeLogLines(),
              ElementsAre("6 /bin/sh: one", "6 /bin/sh: two", "6 /bin/sh: esc?[1m", "6 /bin/sh: no end"));
}

TEST_F(Exec, AFloodOfOutputIsCutAndTheProgramStillEnds) {
  ASSERT_EQ(QARDCExec(kShell, "-c", "head -c 1G /dev/zero | tr '\\0' 'x'", nullptr, nullptr), 0);
  EXPECT_THAT(TakeLogLines(), ElementsAre("6 /bin/sh: " + std::string(500, 'x'), "6 /bin/sh: further output left out"));
  ASSERT_EQ(QARDCExec(kShell, "-c", "yes | head -n 1000", nullptr, nullptr), 0);
  const auto lines = TakeLogLines();
  EXPECT_THAT(lines, SizeIs(101));
  EXPECT_EQ(lines.back(), "6 /bin/sh: further output left out");
}

// Whether a process of that number still lives; one that is dead and not yet reaped by its new parent does not.
bool Lives(const std::string &pid) {
  const std::string stat = ReadText("/proc/" + pid + "/stat");
  const size_t end = stat.rfind(") ");
  return end != std::string::npos && stat[end + 2] != 'Z' && stat[end + 2] != 'X';
}

bool DiesSoon(const std::string &pid) {
  for (int round = 0; round < 200 && Lives(pid); ++round) {
    std::this_thread::sleep_for(milliseconds(10));
  }
  return !Lives(pid);
}

std::string FirstWord(const std::string &path) {
  const auto words = vornhost::SplitWords(ReadText(path));
  return words.empty() ? "" : words.front();
}

TEST_F(Exec, AtTheTimeLimitTheWholeGroupIsKilled) {
  const auto begin = steady_clock::now();
  const int result = RunLimited("trap '' TERM HUP INT; sleep 300 & echo $! > /tmp/grandchild; wait", milliseconds(300));
  EXPECT_TRUE(FailedWith(result, QARDC_ERR_TIMEOUT));
  const auto took = steady_clock::now() - begin;
  EXPECT_GE(took, milliseconds(300));
  EXPECT_LT(took, milliseconds(5000));
  EXPECT_THAT(TakeLogLines(), ElementsAre("3 /bin/sh did not end in 300 ms and was killed"));
  ASSERT_FALSE(FirstWord("/tmp/grandchild").empty());
  EXPECT_TRUE(DiesSoon(FirstWord("/tmp/grandchild")));
}

TEST_F(Exec, AStoppedProgramIsEndedAtTheLimit) {
  EXPECT_TRUE(FailedWith(RunLimited("kill -STOP $$", milliseconds(200)), QARDC_ERR_TIMEOUT));
}

TEST_F(Exec, AnEndlessFloodIsEndedAtTheLimit) {
  const auto begin = steady_clock::now();
  EXPECT_TRUE(FailedWith(RunLimited("while :; do echo yyyyyyyyyyyyyyyyyyyyyyyyyy; done", milliseconds(300)),
                         QARDC_ERR_TIMEOUT));
  EXPECT_LT(steady_clock::now() - begin, milliseconds(5000));
}

TEST_F(Exec, AProcessLeftBehindThatHoldsThePipeIsNotWaitedFor) {
  const auto begin = steady_clock::now();
  EXPECT_EQ(RunLimited("sleep 300 & echo $! > /tmp/daemon; echo started", milliseconds(20000)), 0);
  EXPECT_LT(steady_clock::now() - begin, milliseconds(5000));
  EXPECT_THAT(TakeLogLines(), ElementsAre("6 /bin/sh: started"));
  const std::string daemon = FirstWord("/tmp/daemon");
  EXPECT_TRUE(Lives(daemon));
  kill(static_cast<pid_t>(std::stol(daemon)), SIGKILL);
}

TEST_F(Exec, AProgramThatClosesItsOutputIsStillWaitedFor) {
  EXPECT_EQ(RunLimited("exec >/dev/null 2>&1; sleep 0.3; echo done > /tmp/done", milliseconds(20000)), 0);
  EXPECT_EQ(ReadText("/tmp/done"), "done\n");
}

TEST_F(Exec, SeveralThreadsRunProgramsAtOnce) {
  std::vector<std::thread> threads;
  threads.reserve(8);
  for (int number = 0; number < 8; ++number) {
    threads.emplace_back([number] {
      for (int round = 0; round < 10; ++round) {
        const std::string code = "exit " + std::to_string(number % 2);
        EXPECT_EQ(QARDCExec(kShell, "-c", code.c_str(), nullptr, nullptr), number % 2 == 0 ? 0 : -1);
      }
    });
  }
  for (std::thread &thread : threads) {
    thread.join();
  }
}

} // namespace
