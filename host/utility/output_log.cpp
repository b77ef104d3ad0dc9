#include "host/utility/output_log.h"

#include "host/utility/log.h"
#include "host/utility/program_runner.h"

#include <algorithm>

namespace vornhost {

void OutputLog::Take(std::string_view bytes) {
  const std::string_view taken = bytes.substr(0, limits_.outputBytes - seen_);
  seen_ += taken.size();
  cut_ = cut_ || taken.size() < bytes.size();
  for (const char byte : taken) {
    if (byte == '\n') {
      WriteLine();
    } else if (line_.size() < limits_.lineBytes) {
      line_ += byte;
    } else {
      cut_ = true;
    }
  }
}

void OutputLog::Finish() {
  WriteLine();
  if (cut_) {
    LogInfo("%s: further output left out", LogText(program_).c_str());
  }
}

void OutputLog::WriteLine() {
  if (line_.empty()) {
    return;
  }
  if (lines_ < limits_.logLines) {
    LogInfo("%s: %s", LogText(program_).c_str(), LogText(line_, limits_.lineBytes).c_str());
    ++lines_;
  } else {
    cut_ = true;
  }
  line_.clear();
}

} // namespace vornhost
