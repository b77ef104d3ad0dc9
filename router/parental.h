// Parental time control: the user's rules, and the enforcement that is built from them.
#ifndef ROUTER_PARENTAL_H
#define ROUTER_PARENTAL_H

#include "router/export.h"

#include <json/value.h>

/// Whether the rule file would hold the rule's texts as they are. One that it would not is found before anything is
/// stopped or written: it must not end the enforcement of the others. The address names a section, so it stands between
/// brackets; whether it is one is the enforcing program's business.
/// @param[in] rule  an element of "rules"
bool CanKeepTimeRule(const Json::Value &rule);

class ROUTER_EXPORT ParentalHandler {
public:
  ParentalHandler();
  virtual ~ParentalHandler();

  /// Takes the rules to be stored.
  /// @param[in] parameters  object with the member "rules", an array of objects: "mac", "clientname" and "schedule"
  ///                        (texts without NUL) and "tcenable" (boolean)
  /// @return false when "rules" is missing
  bool CheckTimeCtrlData(const Json::Value &parameters);

  /// Writes the taken rules to the rule file in place of what it holds; without rules there is no file.
  /// @return false when a rule cannot be written; those before it stay
  bool SetTimeCtrlConfig() const;

  /// @param[out] out  {"rules": [...]}, in the order of the rule file
  /// @return false when the rule file cannot be read, or has no sections; `out` holds what was read before
  bool LoadTimeControlData(Json::Value &out) const;

  /// @param[in] schedule  one character for each hour of the week
  /// @return whether the present hour is marked; true for a null schedule, and false beyond the schedule's end
  bool GetScheduleNowStatus(const char *schedule) const;

  /// Makes the enforcing configuration, and its copy in /tmp, from the rule file: the rules that are switched on.
  bool SetTimeCtrlRules() const;

  /// Starts enforcement as the rule file says. Nothing is undone when a step fails: the next stop cleans up.
  bool StartTimeCtrlRules() const;

  /// Ends enforcement, when it is running.
  bool StopTimeCtrlRules() const;

private:
  Json::Value timeCtrlData_; ///< the request's parameters, once taken
  int timeCtrlDataValid_;    ///< 1 once they are
};

#endif
