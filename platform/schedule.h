// The scheduler: commands that run at set hours, and the weekly schedule grid.
#ifndef PLATFORM_SCHEDULE_H
#define PLATFORM_SCHEDULE_H

#include <stddef.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/// A scheduled command. Zeroed before it is filled.
struct VORNScheduleRecord {
  int32_t weekdays;      ///< bit 0 = Sunday ... bit 6 = Saturday; 127 = every day
  int32_t startHour;     ///< 0 to 23, local time
  int32_t intervalHours; ///< every so many hours from the start hour on
  int32_t lastHour;      ///< 0 to 23, included
  int32_t reserved[2];   ///< 0
  char command[1024];    ///< program and arguments, separated by blanks; NUL-terminated. It names the task.
};

/// Registers a command; a task of the same command is replaced. Safe from several threads.
/// @param[in] flags  0
/// @retval >=0  registered, durably
/// @retval <0   a field out of its range, a command that cannot be kept, or it could not be written
int VORNScheduleSet(const struct VORNScheduleRecord *record, int flags);

/// Removes the task of that command; one that is not registered is no error. Safe from several threads.
/// @retval >=0  it is not registered any more
/// @retval <0   it could not be removed
int VORNScheduleRemove(const char *command);

/// The slot of the weekly grid that holds the present moment, in local time.
/// @retval 0 to 167  day of the week (Sunday = 0) x 24 + hour
/// @retval <0        there is none: the clock was never set
int VORNSchedGetNowIndex(void);

#ifdef __cplusplus
}

static_assert(offsetof(VORNScheduleRecord, weekdays) == 0);
static_assert(offsetof(VORNScheduleRecord, startHour) == 4);
static_assert(offsetof(VORNScheduleRecord, intervalHours) == 8);
static_assert(offsetof(VORNScheduleRecord, lastHour) == 12);
static_assert(offsetof(VORNScheduleRecord, reserved) == 16);
static_assert(offsetof(VORNScheduleRecord, command) == 24);
static_assert(sizeof(VORNScheduleRecord) == 1048);
#endif

#endif
