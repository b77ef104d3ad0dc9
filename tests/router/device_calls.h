// What the tests of the rows over the device store share: the daemon's time stamps and calls as they are recorded.
#ifndef TESTS_ROUTER_DEVICE_CALLS_H
#define TESTS_ROUTER_DEVICE_CALLS_H

#include "tests/router/scripted_platform.h"

#include <ctime>
#include <string>

namespace scripted {

// Local time so many seconds ago, as the daemon writes it.
inline std::string Ago(int seconds) {
  const std::time_t then = std::time(nullptr) - seconds;
  std::tm fields{};
  localtime_r(&then, &fields);
  char text[32];
  std::strftime(text, sizeof(text), "%T %Y/%m/%d", &fields);
  return text;
}

inline Lines DeviceListCalls(const std::string &scannerType) {
  return {"NetClient()", "GetDeviceListData(" + scannerType + ", null)", "~NetClient()"};
}

} // namespace scripted

#endif
