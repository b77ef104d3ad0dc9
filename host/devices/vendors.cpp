#include "host/devices/vendors.h"

#include "host/devices/device_text.h"
#include "host/devices/mac_address.h"

#include <algorithm>
#include <fstream>
#include <string_view>
#include <unordered_map>

namespace vornhost {

namespace {

// A registry and how many hexadecimal digits it assigns, the longest first.
struct Registry {
  const char *file;
  size_t digits;
};

constexpr Registry kRegistries[] = {{"oui36.csv", 9}, {"iab.csv", 9}, {"mam.csv", 7}, {"oui.csv", 6}};

std::string DigitsOf(const std::string &mac) {
  std::string digits;
  for (const char c : mac) {
    if (c != ':') {
      digits += c >= 'a' && c <= 'f' ? static_cast<char>(c - 'a' + 'A') : c;
    }
  }
  return digits;
}

// A field of RFC 4180, which may be quoted.
std::string FieldAt(std::string_view rest) {
  if (!rest.starts_with('"')) {
    return std::string(rest.substr(0, rest.find(',')));
  }
  std::string field;
  for (size_t i = 1; i < rest.size(); ++i) {
    if (rest[i] != '"') {
      field += rest[i];
    } else if (i + 1 < rest.size() && rest[i + 1] == '"') {
      field += rest[i++];
    } else {
      break;
    }
  }
  return field;
}

using Wanted = std::unordered_multimap<std::string, std::string>; // prefix to MAC address

// "REGISTRY,PREFIX,Name,Address". The lines of an address with line breaks fit no prefix.
void Search(const std::string &path, const Wanted &wanted, size_t digits, std::map<std::string, std::string> &vendors) {
  std::ifstream file(path);
  std::string line;
  while (std::getline(file, line)) {
    const size_t begin = line.find(',') + 1;
    if (begin == 0 || line.size() < begin + digits + 1 || line[begin + digits] != ',') {
      continue;
    }
    const auto [first, last] = wanted.equal_range(line.substr(begin, digits));
    if (first == last) {
      continue;
    }
    const std::string name = CleanText(FieldAt(std::string_view(line).substr(begin + digits + 1)));
    std::for_each(first, last, [&](const auto &entry) { vendors.try_emplace(entry.second, name); });
  }
}

} // namespace

std::map<std::string, std::string> VendorsOf(const std::vector<std::string> &macs) {
  std::map<std::string, std::string> vendors;
  for (const Registry &registry : kRegistries) {
    Wanted wanted;
    for (const std::string &mac : macs) {
      if (!IsPrivateMac(mac) && !vendors.contains(mac)) {
        wanted.emplace(DigitsOf(mac).substr(0, registry.digits), mac);
      }
    }
    if (!wanted.empty()) {
      Search(std::string(kRegistryFolder) + "/" + registry.file, wanted, registry.digits, vendors);
    }
  }
  return vendors;
}

} // namespace vornhost
