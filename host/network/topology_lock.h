// The lock file of a topology switch.
//
// It exists from before the first change until everything is final, and holds the snapshot from its first moment: it is
// written without a name and then given one, which fails when there is one already. Its maker holds flock(2) on it; a
// lock file that nobody holds was left by a process that died.
#ifndef HOST_NETWORK_TOPOLOGY_LOCK_H
#define HOST_NETWORK_TOPOLOGY_LOCK_H

#include "host/utility/unique_fd.h"

#include <string>

namespace vornhost {

class TopologyLock {
public:
  enum class State {
    kAbsent,
    kHeld,    ///< a switch is under way
    kStale,   ///< its holder died; it is ours now
    kForeign, ///< something that no switch makes: a link, a folder, another user's file
  };

  /// Looks whether there is a lock, and takes over one that nobody holds. Throws std::runtime_error when that cannot be
  /// told.
  State TakeOver();

  /// Makes the lock. @return false when there is one already. Throws std::runtime_error when it cannot be made.
  bool Make(const std::string &content);

  /// What the lock that is ours holds; empty when it cannot be read as a text.
  std::string Read() const;

  /// Removes the lock that is ours. Throws std::runtime_error when that cannot be done.
  void Remove();

private:
  UniqueFd file_; // with flock held
};

} // namespace vornhost

#endif
