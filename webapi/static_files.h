// The page: files that anyone may have, kept in memory.
#ifndef WEBAPI_STATIC_FILES_H
#define WEBAPI_STATIC_FILES_H

#include "webapi/answer.h"
#include "webapi/request_head.h"

#include <string>
#include <string_view>
#include <unordered_map>

namespace vornwebapi {

/// One way to send a file: its fields in the header, each line with its CR LF, and its bytes.
struct FileForm {
  std::string fields;
  std::string body;
  std::string etag;
};

/// A folder, read whole at the start. A request is held against the index of its paths and against nothing else: no
/// path is ever put together from what a client sends, and no file is opened for one.
class StaticFiles {
public:
  /// Takes regular files with a known extension, whose names are letters, digits, '.', '_' and '-' and do not begin
  /// with a dot; folders in it likewise. Symbolic links are not followed. What is left out for its size is logged.
  /// @param[in] folder  one that is not there has no files
  void Load(const std::string &folder);

  size_t Count() const { return files_.size(); }

  /// The answer to a GET or HEAD. The files outlive every connection; the answer refers to them.
  Answer Get(const RequestHead &head) const;

private:
  struct File {
    FileForm plain;
    FileForm gzip; ///< without body: not worth it
  };

  bool Add(const std::string &path, std::string_view target, size_t &bytes);

  std::unordered_map<std::string, File> files_; // by target
};

} // namespace vornwebapi

#endif
