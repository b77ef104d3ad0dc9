#include "host/devices/dns_message.h"

#include "host/devices/device_text.h"
#include "host/network/ipv4.h"

#include <algorithm>
#include <array>
#include <optional>

namespace vornhost {

namespace {

constexpr uint16_t kTypeA = 1;
constexpr uint16_t kTypePtr = 12;
constexpr uint16_t kTypeTxt = 16;
constexpr uint16_t kTypeSrv = 33;
constexpr uint16_t kClassIn = 1;
constexpr uint16_t kClassMask = 0x7fff; // the top bit says "flush your cache" (RFC 6762 section 10.2)
constexpr uint16_t kIsAnswer = 0x8000;
constexpr size_t kHeader = 12;
constexpr int kJumpLimit = 16;    // of a compressed name
constexpr int kRecordLimit = 256; // of a message
constexpr size_t kQuestionLimit = 32;

// A service and the kind of device that offers it. The first that fits wins: what a device is stands before what it can
// do as well.
struct ServiceKind {
  std::string_view service;
  std::string_view kind;
};

constexpr ServiceKind kServices[] = {
    {"_ipp._tcp", "Printer"},
    {"_ipps._tcp", "Printer"},
    {"_pdl-datastream._tcp", "Printer"},
    {"_printer._tcp", "Printer"},
    {"_axis-video._tcp", "Network Camera"},
    {"_rtsp._tcp", "Network Camera"},
    {"_googlecast._tcp", "Media Player"},
    {"_airplay._tcp", "Media Player"},
    {"_raop._tcp", "Media Player"},
    {"_spotify-connect._tcp", "Media Player"},
    {"_adisk._tcp", "nas"},
    {"_afpovertcp._tcp", "nas"},
    {"_workstation._tcp", "computer"},
    {"_device-info._tcp", ""},
    {"_smb._tcp", ""},
    {"_hap._tcp", ""},
};

constexpr std::string_view kModelKeys[] = {"ty=", "model=", "md=", "usb_MDL="};

void AppendNumber(std::string &message, uint16_t number) {
  message += static_cast<char>(number >> 8U);
  message += static_cast<char>(number & 0xffU);
}

void AppendQuestion(std::string &message, std::string_view name) {
  while (!name.empty()) {
    const std::string_view label = name.substr(0, name.find('.'));
    message += static_cast<char>(label.size());
    message += label;
    name.remove_prefix(std::min(label.size() + 1, name.size()));
  }
  message += '\0';
  AppendNumber(message, kTypePtr);
  AppendNumber(message, kClassIn);
}

// Asked from another port than 5353, the answer comes back to it alone (RFC 6762 section 6.7).
std::string Question(const std::vector<std::string> &names) {
  std::string message;
  for (const size_t number : {size_t{0}, size_t{0}, names.size(), size_t{0}, size_t{0}, size_t{0}}) {
    AppendNumber(message, static_cast<uint16_t>(number));
  }
  for (const std::string &name : names) {
    AppendQuestion(message, name);
  }
  return message;
}

std::string ReverseName(uint32_t address) {
  std::string name;
  for (unsigned shift = 0; shift < 32; shift += 8) {
    name += std::to_string((address >> shift) & 0xffU) + '.';
  }
  return name + "in-addr.arpa";
}

class Reader {
public:
  explicit Reader(std::string_view message) : message_(message) {}

  size_t Position() const { return at_; }
  void Seek(size_t at) { at_ = at; }

  std::optional<uint16_t> Number() {
    if (message_.size() - at_ < 2) {
      return std::nullopt;
    }
    const auto high = static_cast<uint8_t>(message_[at_]);
    const auto low = static_cast<uint8_t>(message_[at_ + 1]);
    at_ += 2;
    return static_cast<uint16_t>(high << 8U | low);
  }

  bool Skip(size_t count) {
    if (message_.size() - at_ < count) {
      return false;
    }
    at_ += count;
    return true;
  }

  std::string_view Bytes(size_t begin, size_t count) const { return message_.substr(begin, count); }

  // A name's labels, joined with dots. A pointer leads back only, so that no message makes it go round.
  std::optional<std::string> Name() {
    std::string name;
    size_t at = at_;
    bool jumped = false;
    for (int jumps = 0; jumps <= kJumpLimit;) {
      if (at >= message_.size()) {
        return std::nullopt;
      }
      const auto length = static_cast<uint8_t>(message_[at]);
      if ((length & 0xc0U) == 0xc0U) {
        if (at + 1 >= message_.size()) {
          return std::nullopt;
        }
        const size_t target = (length & 0x3fU) << 8U | static_cast<uint8_t>(message_[at + 1]);
        at_ = jumped ? at_ : at + 2;
        jumped = true;
        ++jumps;
        if (target >= at) {
          return std::nullopt;
        }
        at = target;
      } else if (length == 0) {
        at_ = jumped ? at_ : at + 1;
        return name;
      } else if ((length & 0xc0U) != 0 || message_.size() - at - 1 < length || name.size() + length > kTextLimit) {
        return std::nullopt;
      } else {
        name += name.empty() ? "" : ".";
        name += message_.substr(at + 1, length);
        at += size_t{1} + length;
      }
    }
    return std::nullopt;
  }

private:
  std::string_view message_;
  size_t at_ = 0;
};

struct Record {
  std::string name;
  uint16_t type = 0;
  size_t begin = 0; // of its data in the message
  size_t length = 0;
};

std::optional<Record> NextRecord(Reader &reader) {
  Record record;
  const std::optional<std::string> name = reader.Name();
  const std::optional<uint16_t> type = name ? reader.Number() : std::nullopt;
  const std::optional<uint16_t> recordClass = type ? reader.Number() : std::nullopt;
  if (!recordClass || !reader.Skip(4)) { // time to live
    return std::nullopt;
  }
  const std::optional<uint16_t> length = reader.Number();
  record.begin = reader.Position();
  if (!length || !reader.Skip(*length)) {
    return std::nullopt;
  }
  record.name = *name;
  record.type = (*recordClass & kClassMask) == kClassIn ? *type : uint16_t{0};
  record.length = *length;
  return record;
}

// Goes through a TXT record's strings (RFC 6763 section 6).
std::string ModelIn(std::string_view strings) {
  std::array<std::string, std::size(kModelKeys)> found;
  while (!strings.empty()) {
    const size_t length = std::min<size_t>(static_cast<uint8_t>(strings.front()), strings.size() - 1);
    const std::string_view pair = strings.substr(1, length);
    for (size_t i = 0; i < found.size(); ++i) {
      if (found[i].empty() && pair.starts_with(kModelKeys[i])) {
        found[i] = CleanText(pair.substr(kModelKeys[i].size()));
      }
    }
    strings.remove_prefix(1 + length);
  }
  const auto *best = std::find_if(found.begin(), found.end(), [](const std::string &model) { return !model.empty(); });
  return best == found.end() ? std::string() : *best;
}

class Collector {
public:
  explicit Collector(uint32_t sender) : sender_(sender), reverse_(ReverseName(sender)) {}

  void Take(Reader &reader, const Record &record) {
    const size_t after = reader.Position();
    reader.Seek(record.begin);
    if (record.type == kTypePtr) {
      TakePointer(reader, record);
    } else if (record.type == kTypeA && record.length == 4) {
      TakeAddress(reader, record);
    } else if (record.type == kTypeTxt && finding_.model.empty()) {
      finding_.model = ModelIn(reader.Bytes(record.begin, record.length));
    }
    if (record.type == kTypePtr || record.type == kTypeSrv) {
      NoteService(record.name);
    }
    reader.Seek(after);
  }

  Finding Result() {
    if (service_ < std::size(kServices)) {
      finding_.type = kServices[service_].kind;
    }
    return finding_;
  }

private:
  void TakePointer(Reader &reader, const Record &record) {
    if (record.name == reverse_) {
      SetName(reader.Name());
    }
  }

  void TakeAddress(Reader &reader, const Record &record) {
    const uint32_t high = *reader.Number();
    const uint32_t low = *reader.Number();
    if ((high << 16U | low) == sender_) {
      SetName(record.name);
    }
  }

  void SetName(const std::optional<std::string> &name) {
    if (name && finding_.name.empty()) {
      finding_.name = CleanName(*name);
    }
  }

  void NoteService(std::string_view name) {
    for (size_t i = 0; i < service_ && i < std::size(kServices); ++i) {
      const std::string full = std::string(kServices[i].service) + ".local";
      if (!kServices[i].kind.empty() && name.ends_with(full) &&
          (name.size() == full.size() || name[name.size() - full.size() - 1] == '.')) {
        service_ = i;
      }
    }
  }

  uint32_t sender_;
  std::string reverse_;
  Finding finding_;
  size_t service_ = std::size(kServices);
};

} // namespace

std::string ServiceQuestion() {
  std::vector<std::string> names;
  for (const ServiceKind &entry : kServices) {
    names.push_back(std::string(entry.service) + ".local");
  }
  return Question(names);
}

std::string ReverseQuestion(const std::vector<uint32_t> &addresses) {
  std::vector<std::string> names;
  for (size_t i = 0; i < std::min(addresses.size(), kQuestionLimit); ++i) {
    names.push_back(ReverseName(addresses[i]));
  }
  return Question(names);
}

Finding ParseAnswer(std::string_view message, uint32_t sender) {
  Reader reader(message);
  if (message.size() < kHeader) {
    return {};
  }
  reader.Skip(2);
  const uint16_t flags = *reader.Number();
  const int questions = *reader.Number();
  int records = *reader.Number();
  records += *reader.Number();
  records += *reader.Number();
  if ((flags & kIsAnswer) == 0 || questions > kRecordLimit) {
    return {};
  }
  for (int i = 0; i < questions; ++i) {
    if (!reader.Name() || !reader.Skip(4)) { // type and class
      return {};
    }
  }
  Collector collector(sender);
  for (int i = 0; i < std::min(records, kRecordLimit); ++i) {
    const std::optional<Record> record = NextRecord(reader);
    if (!record) {
      break;
    }
    collector.Take(reader, *record);
  }
  return collector.Result();
}

} // namespace vornhost
