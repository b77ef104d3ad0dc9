// One process at a time changes the network.
#ifndef HOST_NETWORK_TURN_H
#define HOST_NETWORK_TURN_H

#include "host/utility/unique_fd.h"

namespace vornhost {

/// The turn ends with the descriptor, also when its owner dies. A snapshot that is taken within a turn cannot be
/// overtaken by another process's change before the lock file is there.
/// @return closed when another process has its turn. Throws std::runtime_error when it cannot be asked for.
UniqueFd TakeTurn();

} // namespace vornhost

#endif
