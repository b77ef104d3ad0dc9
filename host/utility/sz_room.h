// How much room a new hash or list makes.
#ifndef HOST_UTILITY_SZ_ROOM_H
#define HOST_UTILITY_SZ_ROOM_H

#include <algorithm>
#include <cstddef>

namespace vornhost {

/// What a caller asks for is a hint; neither a wild number nor thousands of small hashes made with the usual 1024 may
/// cost memory.
constexpr size_t RoomFor(size_t asked) {
  return std::min<size_t>(asked, 64);
}

} // namespace vornhost

#endif
