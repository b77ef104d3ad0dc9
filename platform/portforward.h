// The port-forward configuration library: a list of named records, each with string pairs, in a file.
#ifndef PLATFORM_PORTFORWARD_H
#define PLATFORM_PORTFORWARD_H

#include "platform/utility.h"

#include <stddef.h>

#ifdef __cplusplus
extern "C" {
#endif

/// One record of a list. Allocated zeroed, as one block, with calloc; freed with its list by VORNPFConfFree.
struct VORNPFRecord {
  char name[1024];            ///< NUL-terminated
  struct QARDCSzHash *values; ///< owned by the record
  struct VORNPFRecord *next;  ///< owned by the record; null at the end
};

/// Reads a file. The three numbers are 0. Safe from several threads.
/// @param[out] head  a new list, the caller's to free; null when the file holds no record
/// @retval >=0  done
/// @retval <0   the file cannot be read; `*head` is null
int VORNPFConfGet(struct VORNPFRecord **head, const char *path, int, int, int);

/// Replaces a file's whole content, durably; names, pairs and their order are kept. Safe from several threads.
/// @param[in] head  the list, not changed and still the caller's; null writes an empty set
/// @retval 0         written
/// @retval non-zero  not written; the file is as it was
int VORNPFConfSet(struct VORNPFRecord *head, const char *path);

/// Frees every record of a list with its pairs; null is allowed.
void VORNPFConfFree(struct VORNPFRecord *head);

#ifdef __cplusplus
}

static_assert(offsetof(VORNPFRecord, name) == 0);
static_assert(offsetof(VORNPFRecord, values) == 1024);
static_assert(offsetof(VORNPFRecord, next) == 1024 + sizeof(void *));
static_assert(sizeof(VORNPFRecord) == 1024 + 2 * sizeof(void *));
#endif

#endif
