#include "host/portforward/record_text.h"

#include "host/utility/atomic_file.h"
#include "host/utility/error.h"
#include "host/utility/line_file.h"
#include "host/utility/section.h"
#include "host/utility/sz_hash.h"

#include <cstdlib>
#include <cstring>

namespace vornhost {

namespace {

constexpr char kLine[] = "%s=\"%s\"\n";
constexpr size_t kNameSize = sizeof(VORNPFRecord::name);
constexpr size_t kPairs = 8; // of a record; more make the hash grow

VORNPFRecord *NewRecord(std::string_view name) {
  if (name.size() >= kNameSize) {
    SetError(QARDC_ERR_SYNTAX);
    return nullptr;
  }
  auto values = std::make_unique<QARDCSzHash>(kPairs);
  auto *record = static_cast<VORNPFRecord *>(std::calloc(1, sizeof(VORNPFRecord)));
  if (record == nullptr) {
    SetError(QARDC_ERR_NO_MEMORY);
    return nullptr;
  }
  std::memcpy(record->name, name.data(), name.size());
  record->values = values.release();
  return record;
}

int RenderRecord(const VORNPFRecord &record, const LineFormat &format, std::string &content) {
  const size_t length = strnlen(record.name, kNameSize);
  if (length == 0 || length == kNameSize || record.values == nullptr) {
    return SetError(QARDC_ERR_BAD_ARGUMENT);
  }
  const auto text = RenderSection({record.name, length}, *record.values, format);
  if (!text) {
    return SetError(QARDC_ERR_SYNTAX);
  }
  content += *text;
  return content.size() > kFileLimit ? SetError(QARDC_ERR_TOO_LARGE) : 0;
}

} // namespace

// Pairs before the first section belong to no record.
int ParseRecords(std::string_view content, RecordList &head) {
  head.reset();
  VORNPFRecord *last = nullptr;
  LineReader reader(content);
  for (std::string_view text; reader.Next(text);) {
    const Line line = ParseLine(text);
    if (line.kind == Line::Kind::kSection) {
      VORNPFRecord *record = NewRecord(line.key);
      if (record == nullptr) {
        return -1;
      }
      if (last == nullptr) {
        head.reset(record);
      } else {
        last->next = record;
      }
      last = record;
    } else if (line.kind == Line::Kind::kPair && last != nullptr && !line.key.empty()) {
      last->values->Set(std::string(line.key), std::string(line.value));
    }
  }
  return 0;
}

int RenderRecords(const VORNPFRecord *head, std::string &content) {
  const auto format = LineFormat::Parse(kLine);
  content.clear();
  for (const VORNPFRecord *record = head; record != nullptr; record = record->next) {
    if (RenderRecord(*record, *format, content) != 0) {
      return -1;
    }
  }
  return 0;
}

} // namespace vornhost
