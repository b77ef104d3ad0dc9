// The rules of the time control, and the one answer to the question whether a device is cut.
#ifndef HOST_TIMECONTROL_RULES_H
#define HOST_TIMECONTROL_RULES_H

#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace vornhost {

/// MAC addresses as CanonicalMac writes them.
using MacSet = std::set<std::string>;

struct TimeRule {
  std::string mac;
  std::string name;
  std::string schedule; ///< one character for each slot of the week; '1': cut
};

/// @param[in] text  six pairs of hexadecimal digits, with ':' or '-' between them
/// @return lower case, with colons; nothing when it is none, or no single device's: the all-zero address, a group's
std::optional<std::string> CanonicalMac(std::string_view text);

/// Whether the slot is marked: the meaning of "status" in the API. A slot beyond the schedule's end is not, and nothing
/// is when there is no slot, because the clock was never set.
bool IsMarked(const std::string &schedule, int slot);

/// Takes the rules out of a section file: a section for each device, named by its address, with "name" and "tc_sched".
/// A rule that cannot be kept is left out with a line in the log that names it.
std::vector<TimeRule> ParseRules(const std::string &content);

/// Reads the rules that are to be enforced. They lie in a folder that everyone may write: only root's own file counts.
/// @retval 0   done
/// @retval <0  with the cause in the log
int ReadRules(std::vector<TimeRule> &rules);

/// One rule a device, in the order of the first of each, with the hours of all of them.
std::vector<TimeRule> JoinRules(const std::vector<TimeRule> &rules);

/// The devices that are cut in that slot. Of several rules for one device each counts.
MacSet CutIn(int slot, const std::vector<TimeRule> &rules);

} // namespace vornhost

#endif
