#include "host/routes/ip_network.h"

#include <arpa/inet.h>

#include <algorithm>
#include <charconv>

namespace vornhost {

std::optional<IpNetwork> IpNetwork::Parse(const std::string &text, int family) {
  IpNetwork out;
  out.family_ = family;
  out.length_ = out.GetBits();
  if (text.find('\0') != std::string::npos || inet_pton(family, text.c_str(), out.bytes_.data()) != 1) {
    return std::nullopt;
  }
  return out;
}

std::optional<IpNetwork> IpNetwork::ParseSubnet(const std::string &text, int family) {
  const size_t slash = std::min(text.find('/'), text.size());
  const auto address = Parse(text.substr(0, slash), family);
  int length = address ? address->GetBits() : 0;
  const char *end = text.data() + text.size();
  if (slash < text.size() && std::from_chars(text.data() + slash + 1, end, length).ptr != end) {
    return std::nullopt;
  }
  return address && length >= 0 && length <= address->GetBits() ? std::optional(address->WithLength(length))
                                                                : std::nullopt;
}

IpNetwork IpNetwork::WithLength(int length) const {
  IpNetwork out = *this;
  out.length_ = length;
  return out;
}

int IpNetwork::GetBits() const {
  return family_ == AF_INET ? 32 : 128;
}

std::array<unsigned char, 16> IpNetwork::Masked(int length) const {
  std::array<unsigned char, 16> out{};
  for (int at = 0; at * 8 < length; ++at) {
    const int kept = std::min(length - at * 8, 8);
    const auto index = static_cast<size_t>(at);
    out[index] = static_cast<unsigned char>(bytes_[index] & 0xff00U >> kept);
  }
  return out;
}

bool IpNetwork::HasHostBits() const {
  return Masked(length_) != bytes_;
}

bool IpNetwork::Contains(const IpNetwork &other) const {
  return family_ == other.family_ && length_ <= other.length_ && Masked(length_) == other.Masked(length_);
}

bool IpNetwork::IsEdge(const IpNetwork &address) const {
  if (family_ != AF_INET || length_ > 30 || !Contains(address)) {
    return false;
  }
  const auto low = Masked(length_);
  auto high = bytes_;
  for (size_t at = 0; at < 4; ++at) {
    const int kept = std::clamp(length_ - static_cast<int>(at) * 8, 0, 8);
    high[at] = static_cast<unsigned char>(low[at] | 0xffU >> kept);
  }
  return address.bytes_ == low || address.bytes_ == high;
}

std::string IpNetwork::GetAddressText() const {
  std::array<char, INET6_ADDRSTRLEN> text{};
  inet_ntop(family_, bytes_.data(), text.data(), text.size());
  return text.data();
}

std::string IpNetwork::GetText() const {
  return length_ == GetBits() ? GetAddressText() : GetAddressText() + "/" + std::to_string(length_);
}

} // namespace vornhost
