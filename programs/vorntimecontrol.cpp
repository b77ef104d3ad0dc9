// vorntimecontrol --apply | --schedule | --disable | --restore | --status
// Cuts the devices whose hour it is off from everything beyond the router.
#include "host/timecontrol/control.h"
#include "host/utility/log.h"

#include <syslog.h>
#include <unistd.h>

#include <cstdio>
#include <exception>
#include <iostream>
#include <string>

namespace {

constexpr int kFailed = 1;
constexpr int kUsage = 2;

int Run(const std::string &command) {
  if (command == "--apply") {
    return vornhost::ApplyTimeControl();
  }
  if (command == "--schedule") {
    return vornhost::ScheduleTimeControl();
  }
  if (command == "--disable") {
    return vornhost::DisableTimeControl();
  }
  if (command == "--restore") {
    return vornhost::RestoreTimeControl();
  }
  if (command == "--status") {
    return vornhost::ShowTimeControl(std::cout);
  }
  std::fputs("usage: vorntimecontrol --apply | --schedule | --disable | --restore | --status\n", stderr);
  return kUsage;
}

} // namespace

int main(int argc, char **argv) {
  openlog("vorntimecontrol", LOG_PID | (isatty(STDERR_FILENO) == 1 ? LOG_PERROR : 0), LOG_DAEMON);
  try {
    const int result = Run(argc == 2 ? argv[1] : "");
    return result < 0 ? kFailed : result;
  } catch (const std::exception &error) {
    vornhost::LogError("%s", vornhost::LogText(error.what()).c_str());
    return kFailed;
  }
}
