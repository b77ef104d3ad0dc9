// Key/value files of the contract.
#include "host/export.h"
#include "host/utility/atomic_file.h"
#include "host/utility/error.h"
#include "host/utility/line_file.h"

#include <limits>
#include <optional>

namespace {

using vornhost::Guarded;
using vornhost::Line;
using vornhost::LineFormat;
using vornhost::SetError;

bool IsName(const char *text) {
  return text != nullptr && *text != '\0';
}

// The last line of that key, as a part of `content`, without its line end.
struct Found {
  std::string_view line;
  std::string_view value;
};

std::optional<Found> FindKey(std::string_view content, std::string_view key) {
  std::optional<Found> found;
  vornhost::LineReader reader(content);
  for (std::string_view text; reader.Next(text);) {
    const Line line = vornhost::ParseLine(text);
    if (line.kind == Line::Kind::kPair && line.key == key) {
      found = Found{text, line.value};
    }
  }
  return found;
}

int CopyOut(std::string_view text, char *value, size_t size) {
  if (text.size() >= size || text.size() > static_cast<size_t>(std::numeric_limits<int>::max())) {
    return SetError(QARDC_ERR_TOO_LARGE);
  }
  text.copy(value, text.size());
  value[text.size()] = '\0';
  return static_cast<int>(text.size());
}

int GetKeyValue(const char *path, const char *key, char *value, size_t size) {
  if (!IsName(path) || !IsName(key) || value == nullptr || size == 0) {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  value[0] = '\0';
  std::string content;
  if (vornhost::ReadWholeFile(path, content) != 0) {
    return -1;
  }
  const auto found = FindKey(content, key);
  return found ? CopyOut(found->value, value, size) : 0;
}

int CheckKeyValue(const char *path, const char *key, const char *value) {
  if (!IsName(path) || !IsName(key) || value == nullptr) {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  std::string content;
  if (vornhost::ReadWholeFile(path, content) != 0) {
    return -1;
  }
  const auto found = FindKey(content, key);
  return found && found->value == value ? 1 : 0;
}

// Puts `line` in the place of the key's last line, which is the one that counts, or at the end.
std::string WithLine(const std::string &old, const std::optional<Found> &found, const std::string &line) {
  std::string fresh = old;
  if (!found) {
    vornhost::AppendLines(fresh, line);
    return fresh;
  }
  const auto begin = static_cast<size_t>(found->line.data() - old.data());
  const size_t length = found->line.size() + (begin + found->line.size() < old.size() ? 1 : 0);
  return fresh.replace(begin, length, line);
}

int SetKeyValue(const char *path, const char *key, const char *value, const char *lineFormat) {
  const auto format = LineFormat::Parse(lineFormat);
  if (!IsName(path) || !IsName(key) || value == nullptr || !format) {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  const auto line = format->Render(key, value);
  if (!line) {
    return SetError(QARDC_ERR_SYNTAX);
  }
  return vornhost::ChangeFile(path, [&key, &value, &line](const std::string &old, std::string &fresh) {
    const auto found = FindKey(old, key);
    fresh = found && found->value == value ? old : WithLine(old, found, *line);
    return 0;
  });
}

} // namespace

VORN_EXPORT int QARDCFileGetKeyValue(const char *path, const char *key, char *value, size_t size, int /*flags*/) {
  return Guarded(-1, [&path, &key, &value, &size] { return GetKeyValue(path, key, value, size); });
}

VORN_EXPORT int QARDCFileSetKeyValue(const char *path, const char *key, const char *value, const char *lineFormat) {
  return Guarded(-1, [&path, &key, &value, &lineFormat] { return SetKeyValue(path, key, value, lineFormat); });
}

VORN_EXPORT int QARDCFileCheckKeyValue(const char *path, const char *key, const char *value, int /*flags*/) {
  return Guarded(-1, [&path, &key, &value] { return CheckKeyValue(path, key, value); });
}
