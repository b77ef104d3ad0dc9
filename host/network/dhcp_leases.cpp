#include "host/network/dhcp_leases.h"

#include "host/network/ipv4.h"
#include "host/network/mac_address.h"
#include "host/utility/atomic_file.h"
#include "host/utility/line_file.h"
#include "host/utility/program_runner.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <optional>

namespace vornhost {

namespace {

// The longest that the domain name system has (RFC 1035, section 2.3.4).
constexpr size_t kNameLimit = 253;

std::optional<std::time_t> ParseTime(const std::string &text) {
  int64_t value = 0;
  const auto [end, fault] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (fault != std::errc() || end != text.data() + text.size() || value < 0) {
    return std::nullopt;
  }
  return static_cast<std::time_t>(value);
}

bool IsHostname(const std::string &text) {
  return text.size() <= kNameLimit && std::all_of(text.begin(), text.end(), [](char c) {
           return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-' || c == '_' ||
                  c == '.';
         });
}

std::optional<DhcpLease> ParseLease(std::string_view line) {
  const std::vector<std::string> words = SplitWords(std::string(line));
  if (words.size() < 5) {
    return std::nullopt;
  }
  const auto expires = ParseTime(words[0]);
  const auto mac = ParseMac(words[1]);
  if (!expires || !mac || !ParseIpv4(words[2].c_str())) {
    return std::nullopt;
  }
  return DhcpLease{*mac, words[2], IsHostname(words[3]) ? words[3] : "", *expires};
}

} // namespace

std::vector<DhcpLease> ParseLeases(std::string_view content, std::time_t now) {
  std::vector<DhcpLease> leases;
  LineReader lines(content);
  for (std::string_view line; lines.Next(line);) {
    auto lease = ParseLease(line);
    if (lease && (lease->expires == 0 || lease->expires > now)) {
      leases.push_back(std::move(*lease));
    }
  }
  return leases;
}

std::vector<DhcpLease> ReadLeases() {
  std::string content;
  if (ReadWholeFile(kLeaseFile, content) != 0) {
    return {};
  }
  return ParseLeases(content, std::time(nullptr));
}

} // namespace vornhost
