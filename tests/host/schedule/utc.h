// Moments for the tests of local time.
#ifndef TESTS_HOST_SCHEDULE_UTC_H
#define TESTS_HOST_SCHEDULE_UTC_H

#include <ctime>

namespace hosttest {

/// A UTC time of 2030, a year that began on a Tuesday. 3 March was a Sunday.
inline std::time_t Utc(int month, int day, int hour, int minute, int second = 0) {
  std::tm utc{};
  utc.tm_year = 2030 - 1900;
  utc.tm_mon = month - 1;
  utc.tm_mday = day;
  utc.tm_hour = hour;
  utc.tm_min = minute;
  utc.tm_sec = second;
  return timegm(&utc);
}

} // namespace hosttest

#endif
