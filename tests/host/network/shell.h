// Commands of the tests' own set-up and of looking at the result; never of what is tested.
#ifndef TESTS_HOST_NETWORK_SHELL_H
#define TESTS_HOST_NETWORK_SHELL_H

#include <string>

namespace hosttest {

/// What a shell command prints. @throws std::runtime_error when it ends with another status than 0
std::string Shell(const std::string &command);

/// A command's exit status, -N when signal N ended it.
int Status(const std::string &command);

/// Asks until the condition holds. @return false when it did not within the time
template <typename Condition> bool Eventually(int milliseconds, const Condition &condition);

/// Removes every link that a test made, and waits until they are gone.
void RemoveLinks();

void WriteFile(const std::string &path, const std::string &content);
std::string ReadFile(const std::string &path);

void Sleep(int milliseconds);

template <typename Condition> bool Eventually(int milliseconds, const Condition &condition) {
  for (int waited = 0; waited < milliseconds; waited += 10) {
    if (condition()) {
      return true;
    }
    Sleep(10);
  }
  return condition();
}

} // namespace hosttest

#endif
