// Reading and changing configuration files whole.
//
// Every change goes one way: the folder is locked, the old file read, the new content made in memory, written to
// ".<name>.new" beside it, fsynced and closed, put in the file's place, and the folder fsynced. A reader without a lock
// sees the old file or the new one; a call that returned 0 is durable; a call that failed leaves the old file.
//
// The lock is flock(2) on the folder: it belongs to the open file description, so it serves threads and processes
// alike, ends with its owner, and leaves nothing behind. Whoever holds it may remove the ".new" file of a writer that
// was killed.
#ifndef HOST_UTILITY_ATOMIC_FILE_H
#define HOST_UTILITY_ATOMIC_FILE_H

#include <chrono>
#include <functional>
#include <string>

namespace vornhost {

/// No configuration file is larger, in bytes; one that is gets neither read nor written.
constexpr size_t kFileLimit = 1024UL * 1024;

/// A writer holds the lock for a few fsyncs. Who waits longer than this waits for a process that is stuck or hostile,
/// and gives up with QARDC_ERR_TIMEOUT.
constexpr std::chrono::milliseconds kLockLimit{30000};

/// Makes a file's new content. The old one is empty when there was no file.
/// @return 0, or negative to give up, with the error set
using RenderContent = std::function<int(const std::string &old, std::string &fresh)>;

/// Reads a whole regular file. A symbolic link is followed.
/// @retval 0   done
/// @retval <0  with the error set; a NUL in the file is QARDC_ERR_SYNTAX
int ReadWholeFile(const char *path, std::string &content);

/// Replaces a file's content, as above; nothing is written when it is the same already. Mode and owner stay; a new file
/// gets mode 0644.
///
/// A symbolic link in the file's place is refused: whoever set it wants the file elsewhere, so a plain file must not
/// take its place, and to write where a link points to would let its owner choose which file is replaced.
/// @retval 0   the file has the new content, durably
/// @retval <0  with the error set; the file is as it was
int ChangeFile(const char *path, const RenderContent &render, std::chrono::milliseconds lockLimit = kLockLimit);

/// Removes a name that is no directory, durably, in turn with the writers.
/// @retval 0   it is not there any more
/// @retval <0  with the error set
int RemoveFile(const char *path);

} // namespace vornhost

#endif
