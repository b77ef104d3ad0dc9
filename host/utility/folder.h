// Folders of the host's own files.
#ifndef HOST_UTILITY_FOLDER_H
#define HOST_UTILITY_FOLDER_H

#include <sys/types.h>

#include <string>

namespace vornhost {

/// Makes a folder if it is not there yet. One that is made is on the disk before something is put into it. Throws
/// std::runtime_error when that fails.
/// @param[in] path  absolute; its parent exists
/// @param[in] mode  of a folder that is made; the umask counts
void MakeFolder(const std::string &path, mode_t mode);

} // namespace vornhost

#endif
