// Names that cannot be guessed.
#ifndef WEBAPI_RANDOM_H
#define WEBAPI_RANDOM_H

#include "webapi/export.h"

#include <cstddef>
#include <string>

namespace vornwebapi {

/// @param[in] bytes  how many of the kernel's generator
/// @return two hexadecimal digits for each; empty when it gives none
VORN_WEBAPI_EXPORT std::string RandomDigits(size_t bytes);

/// The same form for bytes at hand.
VORN_WEBAPI_EXPORT std::string HexDigits(const unsigned char *bytes, size_t count);

} // namespace vornwebapi

#endif
