#include "webapi/config.h"
#include "webapi/log.h"
#include "webapi/module.h"
#include "webapi/server.h"

#include <malloc.h>
#include <sys/eventfd.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <climits>
#include <csignal>
#include <cstdint>
#include <cstdio>
#include <cstdlib>

namespace {

int stopDescriptor = -1;

void OnStopSignal(int /*signal*/) {
  const std::uint64_t one = 1;
  [[maybe_unused]] const ssize_t written = write(stopDescriptor, &one, sizeof one);
}

void OnBrokenPipe(int /*signal*/) {}

// Handlers, not masks or ignored signals: programs that the module starts have the defaults again.
bool SetSignals() {
  stopDescriptor = eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
  struct sigaction action {};
  action.sa_flags = SA_RESTART;
  action.sa_handler = OnBrokenPipe;
  const bool piped = sigaction(SIGPIPE, &action, nullptr) == 0;
  action.sa_handler = OnStopSignal;
  return stopDescriptor >= 0 && piped && sigaction(SIGTERM, &action, nullptr) == 0 &&
         sigaction(SIGINT, &action, nullptr) == 0;
}

// A descriptor a connection, and some for the module.
void RaiseDescriptorLimit(const vornwebapi::Config &config) {
  constexpr rlim_t kForModule = 256;
  rlimit limit{};
  if (getrlimit(RLIMIT_NOFILE, &limit) == 0 && limit.rlim_cur < config.connections + kForModule) {
    limit.rlim_cur = std::min<rlim_t>(limit.rlim_max, config.connections + kForModule);
    setrlimit(RLIMIT_NOFILE, &limit);
  }
}

/// A fault names a file first and the reason last: none of it may be left out.
int Refuse(const std::string &fault) {
  constexpr size_t kLongestFault = 2 * PATH_MAX;
  const std::string text = vornwebapi::Printable(fault, kLongestFault);
  std::fprintf(stderr, "vornwebd: %s\n", text.c_str());
  vornwebapi::Log(vornwebapi::LogKind::kLifecycle, "not started: %s", text.c_str());
  return EXIT_FAILURE;
}

} // namespace

int main(int argc, char **argv) {
  mallopt(M_ARENA_MAX, 2); // one arena a thread would hold megabytes for nothing
  vornwebapi::Config config;
  std::string fault;
  switch (vornwebapi::ReadConfig(argc, argv, config, fault)) {
  case vornwebapi::Start::kHelp:
    std::fputs(vornwebapi::DescribeKeys().c_str(), stdout);
    return EXIT_SUCCESS;
  case vornwebapi::Start::kRefused:
    return Refuse(fault);
  case vornwebapi::Start::kServe:
    break;
  }
  vornwebapi::OpenLog(config.logToStandardError);
  RaiseDescriptorLimit(config);
  std::vector<VORN::APIEntry> rows;
  if (!SetSignals() || !vornwebapi::LoadModule(config.module, rows, fault)) {
    return Refuse(fault);
  }
  vornwebapi::Server server(config, rows);
  if (!server.Open(fault)) {
    return Refuse(fault);
  }
  vornwebapi::Log(vornwebapi::LogKind::kLifecycle, "serving %zu rows of %s on %s", rows.size(),
                  vornwebapi::Printable(config.module, PATH_MAX).c_str(), server.Address().c_str());
  if (!server.Run(stopDescriptor)) {
    _exit(EXIT_SUCCESS); // threads of the module still run: nothing that they use may be torn down
  }
  return EXIT_SUCCESS;
}
