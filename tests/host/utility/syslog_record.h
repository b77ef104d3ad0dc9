// The system log of a test program: what it would have been sent is kept instead.
#ifndef TESTS_HOST_UTILITY_SYSLOG_RECORD_H
#define TESTS_HOST_UTILITY_SYSLOG_RECORD_H

#include <string>
#include <vector>

namespace hosttest {

/// The lines since the last call, oldest first, each as "<level> <text>" with the level as a number.
std::vector<std::string> TakeLogLines();

} // namespace hosttest

#endif
