// Program execution of the contract.
#include "host/export.h"
#include "host/utility/error.h"
#include "host/utility/program_runner.h"

#include <array>
#include <cstdarg>

namespace {

int Run(std::vector<std::string> words, const std::vector<const char *> &arguments) {
  if (words.empty()) { // else the first argument would be taken for the program
    return vornhost::SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  words.insert(words.end(), arguments.begin(), arguments.end());
  return vornhost::ProgramRunner().Run(words);
}

} // namespace

VORN_EXPORT int QARDCExec(const char *program, const char *a1, const char *a2, const char *a3, const char *a4) {
  return vornhost::Guarded(-1, [&program, &a1, &a2, &a3, &a4] {
    if (program == nullptr) {
      return vornhost::SetError(QARDC_ERR_BAD_ARGUMENT);
    }
    std::vector<const char *> arguments;
    for (const char *argument : std::array{a1, a2, a3, a4}) {
      if (argument == nullptr) {
        break;
      }
      arguments.push_back(argument);
    }
    return Run(vornhost::SplitWords(program), arguments);
  });
}

VORN_EXPORT int QARDCExecl(const char *program, int flags, ...) {
  va_list list;
  va_start(list, flags);
  const int result = vornhost::Guarded(-1, [&program, &list] {
    if (program == nullptr) {
      return vornhost::SetError(QARDC_ERR_BAD_ARGUMENT);
    }
    std::vector<const char *> arguments;
    // NOLINTNEXTLINE(clang-analyzer-valist.Uninitialized): a false alarm of clang-tidy 14
    while (const char *argument = va_arg(list, const char *)) {
      arguments.push_back(argument);
    }
    return Run(vornhost::SplitWords(program), arguments);
  });
  va_end(list);
  return result;
}
