// A section of a section file, as text.
#ifndef HOST_UTILITY_SECTION_H
#define HOST_UTILITY_SECTION_H

#include "host/utility/line_file.h"
#include "platform/utility.h"

#include <optional>
#include <string>
#include <string_view>

namespace vornhost {

/// @return the header and a line for each pair, in the hash's order; nothing when reading them would not give back
///         exactly this name and these pairs
std::optional<std::string> RenderSection(std::string_view name, const QARDCSzHash &pairs, const LineFormat &format);

} // namespace vornhost

#endif
