#include "host/schedule/local_time.h"

#include "host/export.h"
#include "platform/schedule.h"

namespace vornhost {

int SlotOf(std::time_t moment) {
  std::tm local{};
  tzset(); // localtime_r alone would keep the zone of the first call, also when the owner has chosen another since
  if (localtime_r(&moment, &local) == nullptr || local.tm_year + 1900 < VORN_BUILD_YEAR) {
    return -1;
  }
  return local.tm_wday * 24 + local.tm_hour;
}

} // namespace vornhost

VORN_EXPORT int VORNSchedGetNowIndex(void) {
  return vornhost::SlotOf(std::time(nullptr));
}
