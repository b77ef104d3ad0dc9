// The system log of the test's own view: what every program in it sends to /dev/log.
#ifndef TESTS_HOST_NETWORK_SYSTEM_LOG_H
#define TESTS_HOST_NETWORK_SYSTEM_LOG_H

#include <string>

namespace hosttest {

/// Puts a /dev of its own in place, with the usual devices and a log. Once, in a mount namespace that is the test's.
void OpenSystemLog();

/// The lines since the last call, each as "<level> program[number]: text", level as a number, without the time.
std::string TakeSystemLog();

} // namespace hosttest

#endif
