// What vorntimecontrol does. Each operation waits for the one that another process has begun; it ends with 0, or
// negative with the cause in the log.
#ifndef HOST_TIMECONTROL_CONTROL_H
#define HOST_TIMECONTROL_CONTROL_H

#include <iosfwd>

namespace vornhost {

/// Begins enforcement: checks the rules in /tmp and loads the table for the present hour.
int ApplyTimeControl();

/// The hourly run: brings the table to the present hour. Changes nothing when it says so already, nor when enforcement
/// was not begun or has been ended, so that a run that comes late cannot cut a device for ever.
int ScheduleTimeControl();

/// Ends enforcement and removes the table.
int DisableTimeControl();

/// After a restart of the device, when /tmp is empty: enforcement as the user's stored rules say.
int RestoreTimeControl();

/// Tells a person what is cut now, and until when.
int ShowTimeControl(std::ostream &out);

} // namespace vornhost

#endif
