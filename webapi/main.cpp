#include "webapi/api_document.h"
#include "webapi/config.h"
#include "webapi/log.h"
#include "webapi/module.h"
#include "webapi/server.h"
#include "webapi/tls.h"

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

/// The state, and what is shown of it: a new administrator's password to the console, once, and the certificate's
/// fingerprint.
bool OpenState(const vornwebapi::Config &config, vornwebapi::Access &access, vornwebapi::TlsContext &tls,
               std::string &fault) {
  std::string password;
  if (!access.Open(password, fault)) {
    return false;
  }
  if (!password.empty()) {
    std::printf("The administrator is \"%s\", the first password is \"%s\" (also in %s).\n", vornwebapi::kAdministrator,
                password.c_str(), access.State().Path("first-password").c_str());
  }
  std::string fingerprint;
  if (config.tls) {
    tls = vornwebapi::OpenTls(access.State(), config.hostNames, fingerprint, fault);
    std::printf("SHA-256 fingerprint of the certificate: %s\n", fingerprint.c_str());
    vornwebapi::Log(vornwebapi::LogKind::kLifecycle, "the certificate is %s", fingerprint.c_str());
  }
  std::fflush(stdout);
  return !config.tls || tls != nullptr;
}

/// A row that is not described is served all the same: the module is needed more than its description.
std::string MakeDocument(const vornwebapi::Config &config, const std::vector<VORN::APIEntry> &rows) {
  std::string description;
  std::vector<std::string> faults;
  const bool read = config.description.empty() || vornwebapi::ReadDescription(config.description, description);
  std::string document = vornwebapi::MakeApiDocument(rows, description, config.tls, faults);
  if (!config.description.empty() && (!read || !faults.empty())) {
    vornwebapi::Log(vornwebapi::LogKind::kLifecycle, "%s: %s",
                    vornwebapi::Printable(config.description, PATH_MAX).c_str(),
                    read ? vornwebapi::Printable(faults.front()).c_str() : "cannot be read");
  }
  return document;
}

/// For root, who can read all of the state anyway: programs of this machine get in without a person.
int MakeToken(const vornwebapi::Config &config) {
  constexpr std::int64_t kTenYears = 3650L * 86'400; // seconds
  vornwebapi::Access access(config);
  std::string fault;
  std::string id;
  std::string text;
  std::string password; // of a new administrator: it stays in its file
  if (!access.Open(password, fault)) {
    return Refuse(fault);
  }
  if (!vornwebapi::Tokens::GoodName(config.makeToken) ||
      access.TheTokens().Make(config.makeToken, true, kTenYears, id, text) != vornwebapi::Tokens::Result::kDone) {
    return Refuse("make-token: no such token can be made");
  }
  std::printf("%s\n", text.c_str());
  return EXIT_SUCCESS;
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
  if (!config.makeToken.empty()) {
    return MakeToken(config);
  }
  std::vector<VORN::APIEntry> rows;
  if (!SetSignals() || !vornwebapi::LoadModule(config.module, rows, fault)) {
    return Refuse(fault);
  }
  vornwebapi::Service service(config, rows);
  service.Page().Load(config.page);
  service.SetDocument(MakeDocument(config, rows));
  vornwebapi::TlsContext tls;
  if (!OpenState(config, service.Gate(), tls, fault)) {
    return Refuse(fault);
  }
  vornwebapi::Server server(config, service, tls.get());
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
