// Local time as the weekly schedule counts it.
#ifndef HOST_SCHEDULE_LOCAL_TIME_H
#define HOST_SCHEDULE_LOCAL_TIME_H

#include <ctime>

namespace vornhost {

constexpr int kSlots = 7 * 24;

/// @return the slot of the weekly grid that holds the moment, in the local time that the time zone has then; -1 when
///         there is none, because the clock was never set: the year is before the one in which this was built
int SlotOf(std::time_t moment);

} // namespace vornhost

#endif
