// rc.network start-dnat | status
// Makes the kernel's port forwards what the rule file and the DMZ file say. Run at start-up, after each change of the
// files, and after a change of the LAN's addresses.
#include "host/portforward/dnat.h"
#include "host/utility/log.h"

#include <syslog.h>
#include <unistd.h>

#include <cstdio>
#include <exception>
#include <iostream>
#include <string>

namespace {

enum ExitCode { kDone = 0, kFailed = 1, kUsage = 2 };

int Run(const std::string &command) {
  if (command == "start-dnat") {
    return vornhost::StartDnat() ? kDone : kFailed;
  }
  if (command == "status") {
    return vornhost::ShowDnatStatus(std::cout) ? kDone : kFailed;
  }
  std::fputs("usage: rc.network start-dnat | status\n", stderr);
  return kUsage;
}

} // namespace

int main(int argc, char **argv) {
  openlog("rc.network", LOG_PID | (isatty(STDERR_FILENO) == 1 ? LOG_PERROR : 0), LOG_DAEMON);
  try {
    return Run(argc == 2 ? argv[1] : "");
  } catch (const std::exception &error) {
    vornhost::LogError("%s", vornhost::LogText(error.what()).c_str());
    return kFailed;
  }
}
