// Turns that threads and processes take at something that several files, or a file and the kernel, hold together.
#ifndef HOST_UTILITY_FILE_TURN_H
#define HOST_UTILITY_FILE_TURN_H

#include "host/utility/unique_fd.h"

#include <chrono>
#include <string>

namespace vornhost {

/// Waits for the turn that a lock file stands for. It ends with the descriptor, also when its owner dies; the file
/// stays.
/// @param[in] path  in a folder that is there, and that only root can write to
/// Throws std::runtime_error when it cannot be had within the limit.
UniqueFd TakeFileTurn(const std::string &path, std::chrono::milliseconds limit);

} // namespace vornhost

#endif
