// Section files of the contract.
#include "host/utility/section.h"

#include "host/export.h"
#include "host/utility/atomic_file.h"
#include "host/utility/error.h"
#include "host/utility/line_file.h"
#include "host/utility/section_index.h"
#include "host/utility/sz_hash.h"
#include "host/utility/sz_list.h"

#include <optional>
#include <set>

namespace vornhost {

namespace {

// The header line, with its line end; nothing when reading it would not give back the name.
std::optional<std::string> RenderHeader(std::string_view name) {
  const std::string text = "[" + std::string(name) + "]";
  const Line line = vornhost::ParseLine(text);
  if (vornhost::HasLineEnd(name) || name.find(']') != std::string_view::npos || line.kind != Line::Kind::kSection ||
      line.key != name) {
    return {};
  }
  return text + "\n";
}

} // namespace

std::optional<std::string> RenderSection(std::string_view name, const QARDCSzHash &pairs, const LineFormat &format) {
  auto text = RenderHeader(name);
  for (const auto &[key, value] : pairs.Pairs()) {
    const auto line = text ? format.Render(key, value) : std::nullopt;
    if (!line) {
      return {};
    }
    *text += *line;
  }
  return text;
}

} // namespace vornhost

namespace {

using vornhost::Guarded;
using vornhost::Line;
using vornhost::LineFormat;
using vornhost::SetError;

int AddSection(const char *path, const char *section, const QARDCSzHash *pairs, const char *lineFormat) {
  const auto format = LineFormat::Parse(lineFormat);
  if (path == nullptr || *path == '\0' || section == nullptr || *section == '\0' || pairs == nullptr || !format) {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  const auto text = vornhost::RenderSection(section, *pairs, *format);
  if (!text) {
    return SetError(QARDC_ERR_SYNTAX);
  }
  return vornhost::ChangeFile(path, [&text](const std::string &old, std::string &fresh) {
    fresh = old;
    vornhost::AppendLines(fresh, *text);
    return 0;
  });
}

int EnumSection(const char *path, QARDCSzList *sections) {
  if (path == nullptr || *path == '\0' || sections == nullptr) {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  const auto index = vornhost::ReadSections(path);
  if (!index) {
    return -1;
  }
  for (const std::string_view name : index->Names()) {
    sections->Append(name);
  }
  return static_cast<int>(index->Names().size());
}

int GetSection(const char *path, const char *section, QARDCSzHash *pairs) {
  if (path == nullptr || *path == '\0' || section == nullptr || pairs == nullptr) {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  const auto index = vornhost::ReadSections(path);
  if (!index) {
    return -1;
  }
  auto reader = index->Find(section);
  if (!reader) {
    return SetError(QARDC_ERR_NOT_FOUND);
  }
  std::set<std::string_view> keys;
  for (std::string_view text; reader->Next(text);) {
    const Line line = vornhost::ParseLine(text);
    if (line.kind == Line::Kind::kSection) {
      break;
    }
    if (line.kind == Line::Kind::kPair && !line.key.empty()) {
      pairs->Set(std::string(line.key), std::string(line.value));
      keys.insert(line.key);
    }
  }
  return static_cast<int>(keys.size());
}

} // namespace

VORN_EXPORT int QARDCFileAddSection(const char *path, const char *section, QARDCSzHash *pairs, const char *lineFormat) {
  return Guarded(-1, [&path, &section, &pairs, &lineFormat] { return AddSection(path, section, pairs, lineFormat); });
}

VORN_EXPORT int QARDCFileEnumSection(const char *path, QARDCSzList *sections) {
  return Guarded(-1, [&path, &sections] { return EnumSection(path, sections); });
}

VORN_EXPORT int QARDCFileGetSection(const char *path, const char *section, QARDCSzHash *pairs) {
  return Guarded(-1, [&path, &section, &pairs] { return GetSection(path, section, pairs); });
}
