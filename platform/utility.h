// The utility library: key/value and section files, string hashes and lists, program execution, error details.
//
// Files are changed whole and durably: readers see the old file or the new one, and what a call reported as done is
// still there after a power cut. Writers of one file take turns, across processes. A text that the file's syntax cannot
// hold, so that it would not be read back as it was given, is refused with a negative result and nothing is written. A
// file of more than 1 MiB is neither read nor written, and a symbolic link in a file's place is read but never written.
//
// Every function may be called from several threads at once; a hash or a list belongs to one thread at a time. Pointers
// that are passed in are not kept. A null pointer where a text or a handle is asked for is an error, never a crash.
#ifndef PLATFORM_UTILITY_H
#define PLATFORM_UTILITY_H

#include <stddef.h>

#ifdef __cplusplus
extern "C" {
#endif

struct QARDCSzHash; ///< texts by key, in the order in which the keys were first set
struct QARDCSzList; ///< texts in order

/// Error codes of QARDCErrGet.
enum {
  QARDC_ERR_NONE = 0,
  QARDC_ERR_BAD_ARGUMENT = 0x0100, ///< a null pointer, an empty name, a format that is none
  QARDC_ERR_NO_MEMORY = 0x0200,
  QARDC_ERR_NOT_FOUND = 0x0300, ///< no such file, section, interface or program
  QARDC_ERR_ACCESS = 0x0400,    ///< the system refuses, or the file is not one to be trusted
  QARDC_ERR_IO = 0x0500,        ///< reading, writing or asking the kernel failed
  QARDC_ERR_SYNTAX = 0x0600,    ///< a text that the file cannot hold, or a file that is none of ours
  QARDC_ERR_TOO_LARGE = 0x0700, ///< more than the buffer or the limit allows
  QARDC_ERR_EXEC = 0x0800,      ///< the program could not be started, or ended with a non-zero status or a signal
  QARDC_ERR_TIMEOUT = 0x0900    ///< the time limit was reached
};

/// Details of the calling thread's last failed call of the platform's C functions. A call that succeeds leaves them.
/// @return one of the codes above
int QARDCErrGet(void);
/// @return the source file that reported it, a static text; empty when there was none
const char *QARDCErrorGetFile(void);
/// @return the line in it
int QARDCErrorGetLine(void);

// Key/value files: lines of key=value. A value may stand in double quotes, which are not part of it; blanks around key
// and value are not either. Empty lines and lines that begin with '#' say nothing and are kept. A key that stands
// several times has its last value.

/// @param[in]  path   the file
/// @param[in]  key    the key, compared exactly
/// @param[out] value  the value, NUL-terminated
/// @param[in]  size   room in `value`, in bytes, the NUL included
/// @param[in]  flags  0
/// @return the value's length in bytes; 0 when the key is absent or its value empty (`value` is then empty);
///         negative when the file cannot be read or the value does not fit
int QARDCFileGetKeyValue(const char *path, const char *key, char *value, size_t size, int flags);

/// Sets one key; every other line stays as it is. The file is made when it does not exist; its folder must.
/// @param[in] lineFormat  the line to write, a format with exactly two "%s", key and value, that ends in a line end
/// @retval 0   written, or the file already said so
/// @retval <0  not written; the file is as it was
int QARDCFileSetKeyValue(const char *path, const char *key, const char *value, const char *lineFormat);

/// @retval 1   the key has exactly this value
/// @retval 0   it has another one, or is absent
/// @retval <0  the file cannot be read
int QARDCFileCheckKeyValue(const char *path, const char *key, const char *value, int flags);

// Section files: "[name]" begins a section, key lines as above follow. Two sections may have the same name.

/// Appends a section.
/// @param[in] pairs       its keys and values, written in the hash's order; not changed
/// @param[in] lineFormat  as above
/// @retval >=0  written
/// @retval <0   not written; the file is as it was
int QARDCFileAddSection(const char *path, const char *section, struct QARDCSzHash *pairs, const char *lineFormat);

/// @param[in,out] sections  the names are appended, in the order of the file, a repeated one as often as it stands
/// @return how many there are; negative when the file cannot be read
int QARDCFileEnumSection(const char *path, struct QARDCSzList *sections);

/// @param[in,out] pairs  the pairs of the first section of that name are set in it; what else it holds stays
/// @return how many pairs the section has; 0 when it has none, negative when there is no such section or the file
///         cannot be read
int QARDCFileGetSection(const char *path, const char *section, struct QARDCSzHash *pairs);

/// @retval 1  there is something of that name, of whatever kind
/// @retval 0  there is not, or it cannot be told
int QARDCFileExist(const char *path);
/// @retval 1  it is a directory, or a link to one
/// @retval 0  it is not
int QARDCFileCheckDir(const char *path);
/// Removes a file; one that does not exist is no error.
/// @retval 0   it is not there any more
/// @retval <0  it could not be removed
int QARDCSysUnlink(const char *path);

/// @param[in] size  how much room to make at the start; it grows as needed
/// @return a new handle, to be freed with the matching function; null when there is no memory
struct QARDCSzHash *QARDCSzHashAlloc(size_t size);
void QARDCSzHashFree(struct QARDCSzHash *hash); ///< null is allowed
/// @retval 0   set; the texts are copied
/// @retval <0  a null argument, an empty key, or no memory
int QARDCSzHashSetValue(struct QARDCSzHash *hash, const char *key, const char *value);
/// @return the value, owned by the hash and valid until the key is set again or removed or the hash freed; null when
///         absent
const char *QARDCSzHashGetValue(struct QARDCSzHash *hash, const char *key);
/// @return the value that the key had, owned by the hash and valid until a key is removed again or the hash is freed;
///         null when absent
char *QARDCSzHashRemoveKey(struct QARDCSzHash *hash, const char *key);

struct QARDCSzList *QARDCSzListAlloc(size_t size); ///< as QARDCSzHashAlloc
/// @return the text at `index`, from 0, owned by the list and valid until the list is changed; null when there is none
const char *QARDCSzListGet(struct QARDCSzList *list, int index);
void QARDCSzListFree(struct QARDCSzList *list); ///< null is allowed

// Programs are started by their absolute path with the given argument vector, without a shell, with standard input from
// /dev/null, every other descriptor closed and signals at their defaults, in a process group of their own, which is
// ended at the time limit. Of what they print, the first 100 lines go to the system log, each cut at 500 bytes; what
// comes after the first MiB is not looked at. A program that is not owned by root,
// or that others may write, is not run.

/// Runs a program with up to four arguments, the first null one ending them, and waits for it. A `program` text with
/// blanks in it is taken apart at them: the first word is the program, the others come before the arguments.
/// @retval 0   it ended with status 0
/// @retval <0  it was not run, ended with another status or a signal, or reached the time limit of 60 seconds
int QARDCExec(const char *program, const char *a1, const char *a2, const char *a3, const char *a4);

/// The same with any number of arguments, ended by a null pointer.
/// @param[in] flags  execution flags; 187 (0xBB) is what callers pass, and every value means the behaviour above
int QARDCExecl(const char *program, int flags, ... /* const char *, ..., null */);

#ifdef __cplusplus
}
#endif

#endif
