#include "host/devices/ssdp.h"

#include "host/devices/device_text.h"
#include "host/utility/line_file.h"

#include <algorithm>
#include <utility>

namespace vornhost {

namespace {

constexpr size_t kLocationLimit = 512;

bool EqualsIgnoringCase(std::string_view one, std::string_view other) {
  return std::equal(one.begin(), one.end(), other.begin(), other.end(), [](char a, char b) {
    const auto lower = [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; };
    return lower(a) == lower(b);
  });
}

std::string_view Trimmed(std::string_view text) {
  const size_t begin = text.find_first_not_of(" \t\r");
  return begin == std::string_view::npos ? std::string_view()
                                         : text.substr(begin, text.find_last_not_of(" \t\r") + 1 - begin);
}

std::string_view HeaderOf(std::string_view message, std::string_view name) {
  LineReader lines(message);
  std::string_view line;
  while (lines.Next(line)) {
    const size_t colon = line.find(':');
    if (colon != std::string_view::npos && EqualsIgnoringCase(Trimmed(line.substr(0, colon)), name)) {
      return Trimmed(line.substr(colon + 1));
    }
  }
  return {};
}

std::string Unescaped(std::string_view text) {
  static constexpr std::pair<std::string_view, char> kEntities[] = {
      {"&lt;", '<'}, {"&gt;", '>'}, {"&quot;", '"'}, {"&apos;", '\''}, {"&amp;", '&'}};
  std::string out;
  while (!text.empty()) {
    const auto *entity = std::find_if(std::begin(kEntities), std::end(kEntities),
                                      [text](const auto &candidate) { return text.starts_with(candidate.first); });
    out += entity == std::end(kEntities) ? text.front() : entity->second;
    text.remove_prefix(entity == std::end(kEntities) ? 1 : entity->first.size());
  }
  return out;
}

// The root device's elements stand before those of the devices in it: the first of a name is its own.
std::string ElementOf(std::string_view xml, const std::string &name) {
  const std::string opening = "<" + name + ">";
  const size_t begin = xml.find(opening);
  if (begin == std::string_view::npos) {
    return {};
  }
  const std::string_view rest = xml.substr(begin + opening.size());
  const size_t end = rest.find('<');
  return end == std::string_view::npos || !rest.substr(end).starts_with("</" + name + ">")
             ? std::string()
             : Unescaped(rest.substr(0, end));
}

// "urn:schemas-upnp-org:device:MediaServer:1" and its like.
std::string KindOf(const std::string &deviceType) {
  static constexpr std::pair<std::string_view, std::string_view> kKinds[] = {
      {":MediaServer:", "Media Server"},
      {":MediaRenderer:", "Media Player"},
      {":Printer:", "Printer"},
      {":DigitalSecurityCamera:", "Network Camera"},
  };
  for (const auto &[part, kind] : kKinds) {
    if (deviceType.find(part) != std::string::npos) {
      return std::string(kind);
    }
  }
  return {};
}

} // namespace

std::string SearchMessage() {
  return "M-SEARCH * HTTP/1.1\r\nHOST: 239.255.255.250:1900\r\nMAN: \"ssdp:discover\"\r\nMX: 2\r\n"
         "ST: upnp:rootdevice\r\n\r\n";
}

std::optional<std::string> ParseLocation(std::string_view message, const std::string &sender) {
  if (!message.starts_with("HTTP/1.1 200") && !message.starts_with("NOTIFY * HTTP/1.1")) {
    return std::nullopt;
  }
  const std::string_view location = HeaderOf(message, "LOCATION");
  const std::string host = "http://" + sender;
  const bool isPlain = std::all_of(location.begin(), location.end(), [](char c) { return c > ' ' && c < 0x7f; });
  if (!isPlain || location.size() > kLocationLimit || !location.starts_with(host)) {
    return std::nullopt;
  }
  std::string_view rest = location.substr(host.size());
  if (rest.starts_with(':')) {
    rest.remove_prefix(1);
    const size_t digits = std::min(rest.find_first_not_of("0123456789"), rest.size());
    if (digits == 0 || digits > 5) {
      return std::nullopt;
    }
    rest.remove_prefix(digits);
  }
  return rest.starts_with('/') ? std::optional(std::string(location)) : std::nullopt;
}

Finding ParseDescription(std::string_view xml) {
  Finding finding;
  finding.name = CleanName(ElementOf(xml, "friendlyName"));
  finding.type = KindOf(ElementOf(xml, "deviceType"));
  finding.model = CleanText(ElementOf(xml, "modelName"));
  return finding;
}

} // namespace vornhost
