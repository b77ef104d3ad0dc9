// Where the sections of a section file begin, so that reading all of them one by one costs no more for each when there
// are many.
#ifndef HOST_UTILITY_SECTION_INDEX_H
#define HOST_UTILITY_SECTION_INDEX_H

#include "host/utility/line_file.h"

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

namespace vornhost {

class SectionIndex {
public:
  explicit SectionIndex(std::string content);
  SectionIndex(const SectionIndex &) = delete;
  SectionIndex &operator=(const SectionIndex &) = delete;

  /// In the order of the file, a repeated one as often as it stands.
  const std::vector<std::string_view> &Names() const { return names_; }
  /// @return what follows the header of the first section of that name
  std::optional<LineReader> Find(std::string_view name) const;

private:
  std::string content_; // the names are parts of it
  std::vector<std::string_view> names_;
  std::unordered_map<std::string_view, std::string_view> bodies_;
};

/// Reads a section file. The calling thread's last one is not read again while the file is the same: the same file, of
/// the same size and times, which lay back far enough when it was read that a later change must show in them.
/// @return null with the error set when it cannot be read
std::shared_ptr<const SectionIndex> ReadSections(const char *path);

} // namespace vornhost

#endif
