#include "host/wireless/file_changes.h"

#include "host/utility/atomic_file.h"
#include "host/utility/log.h"
#include "platform/utility.h"

#include <stdexcept>

namespace vornhost {

void FileChanges::Replace(const std::string &path, const std::function<std::string(const std::string &old)> &render) {
  Old old{path, std::nullopt};
  const bool existed = QARDCFileExist(path.c_str()) == 1;
  const auto change = [&old, &render](const std::string &content, std::string &fresh) {
    old.content = content;
    fresh = render(content);
    return 0;
  };
  if (ChangeFile(path.c_str(), change) != 0) {
    throw std::runtime_error(path + ": cannot be written");
  }
  if (!existed) {
    old.content.reset();
  }
  done_.push_back(std::move(old));
}

void FileChanges::Undo() {
  for (; !done_.empty(); done_.pop_back()) {
    const Old &old = done_.back();
    const auto restore = [&old](const std::string &, std::string &fresh) {
      fresh = *old.content;
      return 0;
    };
    const int result = old.content ? ChangeFile(old.path.c_str(), restore) : RemoveFile(old.path.c_str());
    if (result != 0) {
      LogError("%s: cannot be put back", LogText(old.path).c_str());
    }
  }
}

} // namespace vornhost
