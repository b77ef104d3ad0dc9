// What becomes of a device store that is damaged: cut, overwritten, no database, or one with other tables.
//
// It is renamed to devices.db.damaged, its journal to devices.db.damaged-wal, and a new store with the rows that can
// still be read takes its place. The last three are kept: of a memory that fails again and again the owner may want an
// older one, and three of them cannot fill a disk. Nothing of theirs is changed.
//
// The new store is built beside the old one (devices.db.new) and is whole and on the disk before the old one is moved.
// Whoever dies in between leaves either the damaged store in its place or none, and then BringStore goes on.
#ifndef HOST_DEVICES_DAMAGED_STORE_H
#define HOST_DEVICES_DAMAGED_STORE_H

#include "host/devices/database.h"

#include <string>

namespace vornhost {

/// Replaces the store as above, with one warning in the log. Throws DatabaseError; then the store is where it was.
/// REQUIRES: the turn at the store.
/// @param[in] damaged  a connection to it, of no use afterwards
/// @param[in] tables   SQL that makes the tables of a new store
/// @param[in] reason   for the log
void ReplaceDamagedStore(Database &damaged, const char *tables, const std::string &reason);

/// Where there is no store: puts a journal that was left over out of the way, which would be taken for the new one's,
/// and puts the store in place that was being brought when somebody died, or an empty file.
/// REQUIRES: the turn at the store.
void BringStore();

/// For a store of no bytes. With a journal beside it, it was cut: SQLite would take the journal for a leftover and
/// delete it. Both are put aside, with a warning in the log, and there is a new store of no bytes.
/// @return false when there is no journal: the store is just new
bool PutAsideCutStore();

} // namespace vornhost

#endif
