#include "host/routes/route_tables.h"

#include "host/utility/atomic_file.h"
#include "host/utility/line_file.h"

#include <linux/rtnetlink.h>

#include <charconv>
#include <filesystem>
#include <optional>
#include <set>

namespace vornhost {

namespace {

namespace fs = std::filesystem;

constexpr char kFile[] = "/etc/iproute2/rt_tables";
constexpr char kFolder[] = "/etc/iproute2/rt_tables.d";

std::string_view TakeWord(std::string_view &line) {
  const size_t begin = std::min(line.find_first_not_of(" \t"), line.size());
  const size_t end = std::min(line.find_first_of(" \t#", begin), line.size());
  const std::string_view word = line.substr(begin, end - begin);
  line.remove_prefix(end);
  return word;
}

// Decimal, or hexadecimal after "0x".
std::optional<uint32_t> ParseId(std::string_view word) {
  const bool isHex = word.starts_with("0x");
  word.remove_prefix(isHex ? 2 : 0);
  uint32_t id = 0;
  const auto [rest, error] = std::from_chars(word.data(), word.data() + word.size(), id, isHex ? 16 : 10);
  if (error != std::errc() || rest != word.data() + word.size() || id == RT_TABLE_UNSPEC) {
    return std::nullopt;
  }
  return id;
}

void ReadTables(const std::string &path, std::map<uint32_t, std::string> &tables) {
  std::string content;
  if (ReadWholeFile(path.c_str(), content) != 0) {
    return; // the other files still say what they say
  }
  LineReader lines(content);
  for (std::string_view line; lines.Next(line);) {
    const auto id = ParseId(TakeWord(line));
    const std::string_view name = TakeWord(line);
    if (id && !name.empty()) {
      tables[*id] = name;
    }
  }
}

} // namespace

std::map<uint32_t, std::string> ReadRouteTables() {
  std::map<uint32_t, std::string> tables = {
      {RT_TABLE_DEFAULT, "default"}, {RT_TABLE_MAIN, "main"}, {RT_TABLE_LOCAL, "local"}};
  ReadTables(kFile, tables);
  std::set<std::string> files;
  std::error_code ignored;
  for (fs::directory_iterator it(kFolder, ignored), end; it != end; it.increment(ignored)) {
    if (it->path().extension() == ".conf") {
      files.insert(it->path().string());
    }
  }
  for (const std::string &file : files) {
    ReadTables(file, tables);
  }
  return tables;
}

} // namespace vornhost
