#include "tests/webapi/server_process.h"

#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>

namespace vorntest {

std::string ModulePath(const std::string &name) {
  return std::string(VORN_TEST_MODULES) + "/" + name + ".so";
}

namespace {

/// A state folder with the one token of VORN_TEST_LOGIN, and a password that nothing matches.
class StateOfTests {
public:
  StateOfTests() {
    std::string pattern = std::filesystem::temp_directory_path() / "webapi_state.XXXXXX";
    path_ = mkdtemp(pattern.data());
    std::ofstream(path_ + "/password") << "none kept\n";
    std::ofstream(path_ + "/tokens")
        << "000000000001 c7885720cc206bad14bd4e9d89f15aa1887b5214c0802cd9019770f571b90824 full 1 9999999999 0 tests\n";
  }
  StateOfTests(const StateOfTests &) = delete;
  StateOfTests &operator=(const StateOfTests &) = delete;
  ~StateOfTests() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
  }
  const std::string &Path() const { return path_; }

private:
  std::string path_;
};

const std::string &KnownState() {
  static const StateOfTests state;
  return state.Path();
}

} // namespace

ServerProcess::ServerProcess(const Setup &setup) {
  std::vector<std::string> words = {VORN_TEST_SERVER, "--log-stderr", "yes"};
  if (!setup.module.empty()) {
    words.insert(words.end(), {"--module", ModulePath(setup.module)});
  }
  if (setup.knownState) {
    words.insert(words.end(), {"--state", KnownState()});
  }
  if (setup.listen) {
    words.insert(words.end(), {"--listen", "127.0.0.1:0"});
  }
  words.insert(words.end(), setup.options.begin(), setup.options.end());
  std::vector<char *> arguments;
  arguments.reserve(words.size() + 1);
  for (std::string &word : words) {
    arguments.push_back(word.data());
  }
  arguments.push_back(nullptr);
  std::array<int, 2> log{};
  if (pipe(log.data()) != 0) {
    std::abort();
  }
  pid_ = fork();
  if (pid_ == 0) {
    setup.inChild();
    dup2(log[1], STDERR_FILENO);
    close(log[0]);
    close(log[1]);
    execv(arguments[0], arguments.data());
    _exit(127);
  }
  close(log[1]);
  reader_ = std::thread([this, descriptor = log[0]] { ReadLog(descriptor); });
  WaitForPort();
}

ServerProcess::~ServerProcess() {
  if (Running()) {
    Signal(SIGKILL);
    Wait();
  }
  reader_.join();
}

void ServerProcess::ReadLog(int descriptor) {
  std::array<char, 4096> buffer{};
  for (ssize_t got = 0; (got = read(descriptor, buffer.data(), buffer.size())) > 0;) {
    const std::lock_guard lock(mutex_);
    log_.append(buffer.data(), static_cast<size_t>(got));
    changed_.notify_all();
  }
  close(descriptor);
  const std::lock_guard lock(mutex_);
  logEnded_ = true;
  changed_.notify_all();
}

// The line is "... serving <n> rows of <module> on <address>:<port>".
void ServerProcess::WaitForPort() {
  std::unique_lock lock(mutex_);
  const auto served = [this] {
    const size_t at = log_.find(": serving ");
    return at != std::string::npos && log_.find('\n', at) != std::string::npos;
  };
  changed_.wait_for(lock, std::chrono::seconds(10), [this, served] { return served() || logEnded_; });
  if (served()) {
    const size_t end = log_.find('\n', log_.find(": serving "));
    port_ = std::atoi(log_.c_str() + log_.rfind(':', end) + 1); // NOLINT(cert-err34-c): the server's own number
  }
}

std::string ServerProcess::Log() const {
  const std::lock_guard lock(mutex_);
  return log_;
}

bool ServerProcess::LogShows(const std::string &text, std::chrono::milliseconds limit) {
  std::unique_lock lock(mutex_);
  return changed_.wait_for(lock, limit, [this, &text] { return log_.find(text) != std::string::npos; });
}

size_t ServerProcess::PrivateMemory() const {
  std::ifstream file("/proc/" + std::to_string(pid_) + "/smaps_rollup");
  size_t sum = 0;
  for (std::string word; file >> word;) {
    if (word == "Private_Clean:" || word == "Private_Dirty:") {
      size_t kilobytes = 0;
      file >> kilobytes;
      sum += kilobytes;
    }
  }
  return sum;
}

long ServerProcess::ProcessorTime() const {
  std::ifstream file("/proc/" + std::to_string(pid_) + "/stat");
  std::string word;
  long user = 0;
  long system = 0;
  for (int field = 1; field <= 13; ++field) {
    file >> word;
  }
  file >> user >> system;
  return user + system;
}

void ServerProcess::Signal(int signal) const {
  kill(pid_, signal);
}

int ServerProcess::Wait(std::chrono::milliseconds limit) {
  const auto deadline = std::chrono::steady_clock::now() + limit;
  while (Running()) {
    if (std::chrono::steady_clock::now() >= deadline) {
      return -1;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
  return status_;
}

int ServerProcess::Stop() {
  Signal(SIGTERM);
  return Wait();
}

bool ServerProcess::Running() {
  int status = 0;
  if (!reaped_ && waitpid(pid_, &status, WNOHANG) == pid_) {
    reaped_ = true;
    status_ = WIFSIGNALED(status) ? 128 + WTERMSIG(status) : WEXITSTATUS(status);
  }
  return !reaped_;
}

} // namespace vorntest
