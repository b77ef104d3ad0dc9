// A program's output on its way to the system log.
#ifndef HOST_UTILITY_OUTPUT_LOG_H
#define HOST_UTILITY_OUTPUT_LOG_H

#include <string>
#include <string_view>

namespace vornhost {

struct RunLimits;

/// Writes what it is given line by line, within the limits, and says once when something was left out.
class OutputLog {
public:
  /// Both are the caller's and must outlive the object.
  OutputLog(const std::string &program, const RunLimits &limits) : program_(program), limits_(limits) {}
  void Take(std::string_view bytes);
  /// Writes a last line that has no end, and the note.
  void Finish();

private:
  void WriteLine();

  const std::string &program_;
  const RunLimits &limits_;
  std::string line_;
  size_t seen_ = 0;
  size_t lines_ = 0;
  bool cut_ = false;
};

} // namespace vornhost

#endif
