// Running programs: the one place of the platform that starts a process.
//
// A program runs with the argument vector that it is given, without a shell; standard input is /dev/null, output and
// errors go into one pipe, every other descriptor is closed, signals are at their defaults and unblocked, and the
// environment is PATH, LANG=C and TZ. It leads a process group of its own, which is killed at the time limit. A process
// that it leaves behind (a daemon that a script starts) lives on, but nobody waits for it, also when it holds the pipe.
//
// Only root can choose what runs: program and every folder on the way to it belong to root and nobody else may write
// them (a sticky folder such as /tmp may be writable: there, nobody else can put a file in the place of root's).
#ifndef HOST_UTILITY_PROGRAM_RUNNER_H
#define HOST_UTILITY_PROGRAM_RUNNER_H

#include <chrono>
#include <string>
#include <vector>

namespace vornhost {

struct RunLimits {
  std::chrono::milliseconds time{60000};
  size_t outputBytes = 1024UL * 1024; ///< of the output, the first so many are looked at; the rest is read and dropped
  size_t logLines = 100;              ///< written to the system log
  size_t lineBytes = 500;             ///< of each
};

class ProgramRunner {
public:
  explicit ProgramRunner(const RunLimits &limits = {}) : limits_(limits) {}

  /// Runs a program and waits for its end.
  /// @param[in] arguments  the program's absolute path, then its arguments
  /// @param[out] status    the status with which it ended by itself; -1 when it did not. Null: not wanted
  /// @retval 0   it ended with status 0
  /// @retval <0  with the error set; the cause is in the system log where the program is to blame
  int Run(const std::vector<std::string> &arguments, int *status = nullptr) const;

private:
  RunLimits limits_;
};

/// Finds a program that only root can choose.
/// @param[in]  program  an absolute path
/// @param[out] path     the program without symbolic links
/// @retval 0   done
/// @retval <0  with the error set
int FindProgram(const std::string &program, std::string &path);

/// The words of a text, taken apart at blanks.
std::vector<std::string> SplitWords(const std::string &text);

} // namespace vornhost

#endif
