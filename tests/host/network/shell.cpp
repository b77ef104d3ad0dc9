#include "tests/host/network/shell.h"

#include <sys/wait.h>

#include <array>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <thread>

namespace hosttest {

namespace {

int Code(int status) {
  return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
}

} // namespace

std::string Shell(const std::string &command) {
  FILE *pipe = popen((command + " 2>&1").c_str(), "re");
  if (pipe == nullptr) {
    throw std::runtime_error("popen");
  }
  std::string out;
  std::array<char, 4096> buffer{};
  for (size_t got = 0; (got = std::fread(buffer.data(), 1, buffer.size(), pipe)) > 0;) {
    out.append(buffer.data(), got);
  }
  const int code = Code(pclose(pipe));
  if (code != 0) {
    throw std::runtime_error(command + ": status " + std::to_string(code) + ": " + out);
  }
  return out;
}

int Status(const std::string &command) {
  return Code(std::system(command.c_str()));
} // NOLINT(cert-env33-c)

void Sleep(int milliseconds) {
  std::this_thread::sleep_for(std::chrono::milliseconds(milliseconds));
}

void RemoveLinks() {
  const auto gone = [] {
    std::istringstream names(Shell("ls /sys/class/net"));
    bool none = true;
    for (std::string name; std::getline(names, name);) {
      if (name != "lo" && name != "bonding_masters") {
        none = false;
        Status("ip link delete dev '" + name + "' 2>/dev/null");
      }
    }
    return none;
  };
  if (!Eventually(5000, gone)) {
    throw std::runtime_error("links stay: " + Shell("ip link"));
  }
}

void WriteFile(const std::string &path, const std::string &content) {
  std::ofstream file(path, std::ios::binary);
  file << content;
  if (!file.flush()) {
    throw std::runtime_error(path);
  }
}

std::string ReadFile(const std::string &path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), {}};
}

} // namespace hosttest
