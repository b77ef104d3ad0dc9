// What must hold for every input.
#ifndef TESTS_FUZZ_DEMAND_H
#define TESTS_FUZZ_DEMAND_H

#include <cstdlib>

namespace vornfuzz {

inline void Demand(bool holds) {
  if (!holds) {
    std::abort();
  }
}

} // namespace vornfuzz

#endif
