// Several files that are changed together.
#ifndef HOST_WIRELESS_FILE_CHANGES_H
#define HOST_WIRELESS_FILE_CHANGES_H

#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace vornhost {

class FileChanges {
public:
  /// Replaces a file, durably. Throws std::runtime_error when it cannot be done.
  /// @param[in] render  from the old content, empty when there is no file, to the new one
  void Replace(const std::string &path, const std::function<std::string(const std::string &old)> &render);

  /// Puts everything back, the last change first. What cannot be put back is logged.
  void Undo();

private:
  struct Old {
    std::string path;
    std::optional<std::string> content; // nothing: there was no file
  };
  std::vector<Old> done_;
};

} // namespace vornhost

#endif
