// Scheduled commands as files of /etc/cron.d, one each. The command names the file, so that a task is found again.
#ifndef HOST_SCHEDULE_CRON_TASK_H
#define HOST_SCHEDULE_CRON_TASK_H

#include "platform/schedule.h"

#include <optional>
#include <string>

namespace vornhost {

/// @return whether cron hands the command on as it stands: program and arguments of plain characters only, because cron
///         gives it to a shell, takes '%' for a line end and cuts it at 1000 characters
bool IsPlainCommand(const std::string &command);

/// @return the file of a command, under a name that cron reads (letters, digits, '-' and '_')
std::string CronFileOf(const std::string &command);

/// @return the whole file of a task; nothing when a field is out of its range
std::optional<std::string> RenderTask(const VORNScheduleRecord &record);

} // namespace vornhost

#endif
