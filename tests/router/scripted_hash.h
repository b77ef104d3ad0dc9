// What stands behind the scripted platform's hash handle.
#ifndef TESTS_ROUTER_SCRIPTED_HASH_H
#define TESTS_ROUTER_SCRIPTED_HASH_H

#include "platform/utility.h"
#include "tests/router/scripted_platform.h"

#include <string>

struct QARDCSzHash {
  std::string name; ///< "hash 0" is the first one that a test's platform made
  scripted::Pairs pairs;
  std::string removed;
};

namespace scripted {

/// Not recorded.
QARDCSzHash *NewHash();
void DeleteHash(QARDCSzHash *hash);

} // namespace scripted

#endif
