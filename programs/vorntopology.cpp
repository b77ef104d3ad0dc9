// vorntopology switch TOPOLOGY | start | recover | status
// Changes the operating topology, or brings the network up. A program of its own, so that a change is carried through,
// or undone, whatever happens to the process that asked for it.
#include "host/network/topology.h"
#include "host/utility/log.h"
#include "host/utility/program_runner.h"

#include <syslog.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <exception>
#include <iostream>
#include <string>

namespace {

using vornhost::Result;

// Nothing but SIGKILL ends a change half-way; every wait in it is bounded. A reader of our output may be gone: that is
// no reason to stop either.
void IgnoreSignals() {
  for (const int signal : {SIGHUP, SIGINT, SIGTERM, SIGQUIT, SIGPIPE}) {
    std::signal(signal, SIG_IGN);
  }
}

// Port forwards are judged by the LAN's addresses, which may be others now. What it says is in the system log.
Result WithForwards(Result result) {
  constexpr char kNetworkScript[] = "/etc/rc.network";
  if (access(kNetworkScript, X_OK) == 0) {
    vornhost::ProgramRunner().Run({kNetworkScript, "start-dnat"});
  }
  return result;
}

Result Run(const std::string &command, int argc, char **argv) {
  if (command == "switch" && argc == 3) {
    return WithForwards(vornhost::SwitchTopology(argv[2]));
  }
  if (argc != 2) {
    return Result::kUsage;
  }
  if (command == "start") {
    return WithForwards(vornhost::StartNetwork());
  }
  if (command == "recover") {
    return WithForwards(vornhost::Recover());
  }
  return command == "status" ? vornhost::ShowStatus(std::cout) : Result::kUsage;
}

} // namespace

int main(int argc, char **argv) {
  IgnoreSignals();
  openlog("vorntopology", LOG_PID | (isatty(STDERR_FILENO) == 1 ? LOG_PERROR : 0), LOG_DAEMON);
  try {
    const Result result = Run(argc > 1 ? argv[1] : "", argc, argv);
    if (result == Result::kUsage) {
      std::fputs("usage: vorntopology switch router|bridge|client | start | recover | status\n", stderr);
    }
    return static_cast<int>(result);
  } catch (const std::exception &error) {
    vornhost::LogError("%s", vornhost::LogText(error.what()).c_str());
    return static_cast<int>(Result::kFailed);
  }
}
