#include "host/export.h"

namespace vornwireless::utils {
class VORN_EXPORT IPAddress;
}

#include "platform/wifi.h"

#include <arpa/inet.h>

#include <cstring>

namespace vornwireless::utils {

IPAddress::IPAddress() = default;

IPAddress &IPAddress::operator=(const std::string &text) {
  text_ = text;
  family_ = AF_UNSPEC;
  std::memset(bytes_, 0, sizeof(bytes_));
  if (std::strlen(text.c_str()) != text.size()) { // inet_pton would see only what stands before a NUL
    return *this;
  }
  for (const int family : {AF_INET, AF_INET6}) {
    if (inet_pton(family, text.c_str(), bytes_) == 1) {
      family_ = family;
      return *this;
    }
  }
  return *this;
}

int IPAddress::GetFamily() const {
  return family_;
}

bool IPAddress::IsValid() const {
  return family_ != AF_UNSPEC;
}

const std::string &IPAddress::GetText() const {
  return text_;
}

const unsigned char *IPAddress::GetBytes() const {
  return IsValid() ? bytes_ : nullptr;
}

} // namespace vornwireless::utils
