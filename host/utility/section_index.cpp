#include "host/utility/section_index.h"

#include "host/utility/atomic_file.h"

#include <sys/stat.h>

#include <chrono>
#include <cstdint>
#include <tuple>

namespace vornhost {

namespace {

// The kernel's file times advance in steps of some milliseconds.
constexpr auto kSettled = std::chrono::milliseconds(50);

int64_t Nanoseconds(const timespec &time) {
  return int64_t{time.tv_sec} * 1'000'000'000 + time.tv_nsec;
}

// What tells one content of a path from another.
using Identity = std::tuple<dev_t, ino_t, off_t, int64_t, int64_t>;

std::optional<Identity> IdentityOf(const char *path) {
  struct stat info {};
  if (stat(path, &info) != 0) {
    return {};
  }
  return Identity(info.st_dev, info.st_ino, info.st_size, Nanoseconds(info.st_mtim), Nanoseconds(info.st_ctim));
}

bool IsSettled(const Identity &identity) {
  timespec now{};
  clock_gettime(CLOCK_REALTIME, &now);
  return Nanoseconds(now) - std::get<4>(identity) > std::chrono::nanoseconds(kSettled).count();
}

struct LastRead {
  std::string path;
  Identity identity;
  std::shared_ptr<const SectionIndex> index;
};

thread_local LastRead lastRead;

} // namespace

SectionIndex::SectionIndex(std::string content) : content_(std::move(content)) {
  LineReader reader(content_);
  for (std::string_view text; reader.Next(text);) {
    const Line line = ParseLine(text);
    if (line.kind == Line::Kind::kSection) {
      names_.push_back(line.key);
      bodies_.emplace(line.key, reader.Rest());
    }
  }
}

std::optional<LineReader> SectionIndex::Find(std::string_view name) const {
  const auto found = bodies_.find(name);
  return found == bodies_.end() ? std::nullopt : std::optional(LineReader(found->second));
}

std::shared_ptr<const SectionIndex> ReadSections(const char *path) {
  const auto before = IdentityOf(path);
  if (before && lastRead.index && lastRead.path == path && lastRead.identity == *before) {
    return lastRead.index;
  }
  lastRead = {};
  std::string content;
  if (ReadWholeFile(path, content) != 0) {
    return nullptr;
  }
  auto index = std::make_shared<const SectionIndex>(std::move(content));
  if (before && IsSettled(*before) && IdentityOf(path) == before) {
    lastRead = {path, *before, index};
  }
  return index;
}

} // namespace vornhost
