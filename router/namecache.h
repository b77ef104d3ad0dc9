// The file in which a listing leaves its stations, so that the next one can show their names at once. It lies in a
// memory file system: a restart empties it.
#ifndef ROUTER_NAMECACHE_H
#define ROUTER_NAMECACHE_H

#include <json/value.h>

namespace router {

inline constexpr char kNameCache[] = "/tmp/connectionlist.txt";

/// Writes the file anew. Two writers at once may mix their texts, which a reader then finds to be no JSON.
/// @return false when the file cannot be opened, or is none (a link, a pipe)
bool WriteNameCache(const Json::Value &listing);

/// @param[in,out] listing  what the file holds; of a text that is no JSON, what the reader made of it. Left as it is
///                         when there is no file, and when the text is not given to the reader: of more than 64 MiB,
///                         with a NUL in it, or nested more than 64 deep
/// @return false when there is no file, or its text is no JSON or was not given to the reader
bool ReadNameCache(Json::Value &listing);

} // namespace router

#endif
