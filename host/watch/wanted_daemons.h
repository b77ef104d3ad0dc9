// The daemons of the ways out that the configuration asks for in the topology that the network is in.
#ifndef HOST_WATCH_WANTED_DAEMONS_H
#define HOST_WATCH_WANTED_DAEMONS_H

#include "host/utility/unique_fd.h"

#include <functional>
#include <string>
#include <vector>

namespace vornhost {

struct WantedDaemon {
  std::string name;                ///< for the log, such as "udhcpc on eth0"
  std::function<UniqueFd()> watch; ///< a descriptor that becomes readable when it ends; closed when it does not run
  std::function<void()> start;     ///< throws std::runtime_error when it cannot be started
};

struct WantedDaemons {
  std::vector<WantedDaemon> daemons;
  bool isWhole = true; ///< false: there may be more a moment later, without news of it
};

/// None where the network is not in the configured topology: that is for a start of the network to mend.
WantedDaemons FindWantedDaemons();

} // namespace vornhost

#endif
