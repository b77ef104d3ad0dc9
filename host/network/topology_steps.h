// A change in steps that is made whole or not at all.
#ifndef HOST_NETWORK_TOPOLOGY_STEPS_H
#define HOST_NETWORK_TOPOLOGY_STEPS_H

#include <functional>
#include <string>
#include <vector>

namespace vornhost {

using Action = std::function<void()>; ///< throws std::exception when it fails

/// Does one thing that may fail without keeping others from being done.
/// @param[in] kind  what is done with `name`, for the log
/// @return false when it failed; the reason is logged
bool Attempt(const char *kind, const std::string &name, const Action &action);

class StepSequence {
public:
  enum class Outcome {
    kDone,     ///< every step is done
    kUndone,   ///< a step failed; it and all before it are undone
    kHalfDone, ///< a step failed, and so did an undo
  };

  /// @param[in] undo  brings back what was before the step, also when the step got only half way
  void Add(std::string name, Action run, Action undo);

  /// Runs the steps in order. At the first that fails, undoes it and those before it, last first; an undo that fails
  /// does not keep the others from running. Failures are logged.
  Outcome Run();

private:
  struct Step {
    std::string name;
    Action run;
    Action undo;
  };

  Outcome UndoFrom(size_t last);

  std::vector<Step> steps_;
};

} // namespace vornhost

#endif
