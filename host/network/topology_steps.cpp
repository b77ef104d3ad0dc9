#include "host/network/topology_steps.h"

#include "host/utility/log.h"

#include <utility>

namespace vornhost {

bool Attempt(const char *kind, const std::string &name, const Action &action) {
  try {
    action();
    return true;
  } catch (const std::exception &error) {
    LogError("%s \"%s\" failed: %s", kind, LogText(name).c_str(), LogText(error.what()).c_str());
    return false;
  }
}

void StepSequence::Add(std::string name, Action run, Action undo) {
  steps_.push_back({std::move(name), std::move(run), std::move(undo)});
}

StepSequence::Outcome StepSequence::Run() {
  for (size_t at = 0; at < steps_.size(); ++at) {
    if (!Attempt("step", steps_[at].name, steps_[at].run)) {
      return UndoFrom(at);
    }
  }
  return Outcome::kDone;
}

StepSequence::Outcome StepSequence::UndoFrom(size_t last) {
  bool whole = true;
  for (size_t at = last + 1; at-- > 0;) {
    whole = Attempt("undo of", steps_[at].name, steps_[at].undo) && whole;
  }
  return whole ? Outcome::kUndone : Outcome::kHalfDone;
}

} // namespace vornhost
