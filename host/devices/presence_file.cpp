#include "host/devices/presence_file.h"

#include "host/devices/mac_address.h"
#include "host/network/names.h"
#include "host/utility/line_file.h"
#include "host/utility/unique_fd.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <charconv>
#include <cstdio>
#include <ctime>

namespace vornhost {

namespace {

// Takes the number at the begin, and the blank before it.
bool TakeNumber(std::string_view &rest, int64_t &number) {
  if (rest.empty() || rest.front() != ' ') {
    return false;
  }
  const auto [end, error] = std::from_chars(rest.data() + 1, rest.data() + rest.size(), number);
  if (error != std::errc()) {
    return false;
  }
  rest.remove_prefix(static_cast<size_t>(end - rest.data()));
  return true;
}

void TakeLine(std::string_view line, PresenceMap &presence) {
  const size_t blank = line.find(' ');
  if (blank == std::string_view::npos) {
    return;
  }
  const std::optional<std::string> mac = ParseDeviceMac(line.substr(0, blank));
  Presence entry;
  RadioFigures radio;
  line.remove_prefix(blank);
  if (!mac || !TakeNumber(line, entry.seen)) {
    return;
  }
  if (!line.empty()) {
    if (!TakeNumber(line, radio.signal) || !TakeNumber(line, radio.received) || !TakeNumber(line, radio.sent) ||
        !line.empty()) {
      return;
    }
    entry.radio = radio;
  }
  presence[*mac] = entry;
}

} // namespace

int64_t BootMillis() {
  timespec now{};
  clock_gettime(CLOCK_BOOTTIME, &now);
  return int64_t{now.tv_sec} * 1000 + now.tv_nsec / 1000000;
}

PresenceMap ParsePresence(std::string_view content) {
  PresenceMap presence;
  LineReader lines(content);
  std::string_view line;
  while (lines.Next(line)) {
    TakeLine(line, presence);
  }
  return presence;
}

std::string RenderPresence(const PresenceMap &presence) {
  std::string content;
  for (const auto &[mac, entry] : presence) {
    content += mac + ' ' + std::to_string(entry.seen);
    if (entry.radio) {
      content += ' ' + std::to_string(entry.radio->signal) + ' ' + std::to_string(entry.radio->received) + ' ' +
                 std::to_string(entry.radio->sent);
    }
    content += '\n';
  }
  return content;
}

bool WritePresence(const PresenceMap &presence) {
  const std::string content = RenderPresence(presence);
  const std::string fresh = std::string(kPresenceFile) + ".new";
  mkdir(kRunFolder, 0755);
  unlink(fresh.c_str());
  UniqueFd file(open(fresh.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
  if (!file.IsOpen() || write(file.Get(), content.data(), content.size()) != static_cast<ssize_t>(content.size())) {
    return false;
  }
  file.Reset();
  return std::rename(fresh.c_str(), kPresenceFile) == 0;
}

} // namespace vornhost
