// vornrun PROGRAM [ARGUMENT...]
// What cron runs in place of a scheduled command itself: becomes the program, but only if nobody but root can have
// chosen it. A scheduled command may lie in /tmp, where after a restart anybody could put a program of that name.
#include "host/utility/log.h"
#include "host/utility/program_runner.h"

#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <exception>
#include <string>

namespace {

constexpr int kCannotRun = 126;

} // namespace

int main(int argc, char **argv) {
  openlog("vornrun", LOG_PID, LOG_DAEMON);
  try {
    const std::string program = argc > 1 ? argv[1] : "";
    std::string path;
    if (vornhost::FindProgram(program, path) != 0) {
      vornhost::LogError("%s is not run: not there, or not root's alone", vornhost::LogText(program).c_str());
      return kCannotRun;
    }
    execv(path.c_str(), argv + 1);
    vornhost::LogError("%s: %s", vornhost::LogText(program).c_str(), std::strerror(errno));
  } catch (const std::exception &error) {
    vornhost::LogError("%s", vornhost::LogText(error.what()).c_str());
  }
  return kCannotRun;
}
