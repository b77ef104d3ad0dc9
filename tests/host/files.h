// Files as the host's tests make and read them, past the code under test.
#ifndef TESTS_HOST_FILES_H
#define TESTS_HOST_FILES_H

#include <sys/stat.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

namespace hosttest {

inline std::string ReadText(const std::string &path) {
  std::ifstream file(path, std::ios::binary);
  return file ? std::string(std::istreambuf_iterator<char>(file), {}) : "<no file>";
}

inline void WriteText(const std::string &path, const std::string &text) {
  std::ofstream(path, std::ios::binary | std::ios::trunc) << text;
}

/// Every name in a folder, hidden ones too, sorted.
inline std::vector<std::string> NamesIn(const std::string &folder) {
  std::vector<std::string> names;
  for (const auto &entry : std::filesystem::directory_iterator(folder)) {
    names.push_back(entry.path().filename().string());
  }
  std::sort(names.begin(), names.end());
  return names;
}

/// A folder for one test, empty at its begin.
inline std::string FreshFolder(const std::string &path) {
  std::filesystem::remove_all(path);
  std::filesystem::create_directories(path);
  return path;
}

inline struct stat StatOf(const std::string &path) {
  struct stat info {};
  lstat(path.c_str(), &info);
  return info;
}

/// Makes a zone of tzdata the machine's, as its owner would under a running server.
inline void PutTimeZone(const std::string &name) {
  unsetenv("TZ");
  std::filesystem::remove("/etc/localtime");
  std::filesystem::create_symlink("/usr/share/zoneinfo/" + name, "/etc/localtime");
}

} // namespace hosttest

#endif
