// main() of the tests that start daemons: everything they start lives in a process namespace that ends with them. They
// need root itself, because the programs that they run are only run when they belong to root.
#include <gtest/gtest.h>

#include <sched.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>

namespace {

int RunTests(int argc, char **argv) {
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  if (mount("proc", "/proc", "proc", 0, nullptr) != 0) {
    std::perror("mount /proc");
    return 2;
  }
  testing::InitGoogleTest(&argc, argv);
  return RUN_ALL_TESTS();
}

} // namespace

int main(int argc, char **argv) {
  struct stat programs {};
  if (std::getenv("VORN_PRIVATE_VIEW") == nullptr || stat("/usr", &programs) != 0 || programs.st_uid != 0) {
    std::fputs("This test needs root, and a view of its own. Run it as root: private_view -- <this program>\n", stderr);
    return 2;
  }
  if (unshare(CLONE_NEWPID) != 0) {
    std::perror("unshare");
    return 2;
  }
  const pid_t tests = fork(); // the first process of the namespace: with it everything in it ends
  if (tests == 0) {
    std::exit(RunTests(argc, argv));
  }
  int status = 0;
  const bool ended = waitpid(tests, &status, 0) == tests && WIFEXITED(status);
  _exit(ended ? WEXITSTATUS(status) : 2); // /proc is the tests' now: a leak check would not find this process in it
}
