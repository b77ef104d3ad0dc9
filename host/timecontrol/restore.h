// The files of a running time control, made again from the user's stored rules.
#ifndef HOST_TIMECONTROL_RESTORE_H
#define HOST_TIMECONTROL_RESTORE_H

namespace vornhost {

/// Makes the enforcing rules and their copy, the copy of the program and the scheduled task; or removes what there is
/// of them, when no rule is switched on.
/// @param[out] enforce  whether there is a rule to be enforced
/// @retval 0   done
/// @retval <0  with the cause in the log
int RestoreFiles(bool &enforce);

} // namespace vornhost

#endif
