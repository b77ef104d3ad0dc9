// The calling thread's last error, as the contract's QARDCErrGet reports it.
#ifndef HOST_UTILITY_ERROR_H
#define HOST_UTILITY_ERROR_H

#include "platform/utility.h"

#include <new>

namespace vornhost {

/// Keeps a QARDC_ERR_* code with the place that found it.
/// (The compilers' own names for the caller's place: clang 14 has no std::source_location.)
/// @return -1, which is what most functions of the contract then return
int SetError(int code, const char *file = __builtin_FILE(), int line = __builtin_LINE());

/// The code that fits an errno of a file operation.
int CodeOfErrno(int number);

/// SetError with that code.
int SetErrno(int number, const char *file = __builtin_FILE(), int line = __builtin_LINE());

/// Runs the body of a contract function: an exception becomes an error code and `failed`, because none may cross the
/// C boundary.
template <typename Body, typename Result>
Result Guarded(Result failed, const Body &body, const char *file = __builtin_FILE(),
               int line = __builtin_LINE()) noexcept {
  try {
    return body();
  } catch (const std::bad_alloc &) {
    SetError(QARDC_ERR_NO_MEMORY, file, line);
  } catch (...) {
    SetError(QARDC_ERR_IO, file, line);
  }
  return failed;
}

} // namespace vornhost

#endif
