// From exceptions to the contract's negative results.
#ifndef HOST_ROUTES_ANSWER_H
#define HOST_ROUTES_ANSWER_H

#include "host/utility/log.h"

#include <exception>

namespace vornhost {

/// Runs the body of a member of the contract, which says whether it did its work.
/// @return 0, or -1 with the reason in the log, which an exception's text is
template <typename Body> int AnswerFor(const char *what, const Body &body) {
  try {
    return body() ? 0 : -1;
  } catch (const std::exception &error) {
    LogError("%s: %s", what, LogText(error.what()).c_str());
    return -1;
  }
}

} // namespace vornhost

#endif
