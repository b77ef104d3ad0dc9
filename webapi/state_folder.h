// What the server keeps: its password, its tokens, its certificate.
#ifndef WEBAPI_STATE_FOLDER_H
#define WEBAPI_STATE_FOLDER_H

#include <functional>
#include <string>

namespace vornwebapi {

/// Files of one folder (0700) that only its owner reads (0600). Every write is whole and durable.
class StateFolder {
public:
  explicit StateFolder(std::string path) : path_(std::move(path)) {}

  /// Makes the folder when there is none, and refuses one that others can look into.
  /// @param[out] fault  what is wrong
  bool Open(std::string &fault) const;

  std::string Path(const std::string &name) const { return path_ + '/' + name; }
  bool Has(const std::string &name) const;
  /// @return false when it is not there or cannot be read
  bool Read(const std::string &name, std::string &content) const;
  /// @param[in] render  makes the new content of the old one, with the folder locked; false: gives up
  /// @return true when it is on the disk; false: the old file stands
  bool Change(const std::string &name,
              const std::function<bool(const std::string &old, std::string &fresh)> &render) const;
  bool Write(const std::string &name, const std::string &content) const;
  void Remove(const std::string &name) const;

private:
  std::string path_;
};

} // namespace vornwebapi

#endif
