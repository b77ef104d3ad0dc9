#include "host/routes/ip_network.h"

#include <arpa/inet.h>

#include <algorithm>

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

std::string IpNetwork::GetAddressText() const {
  std::array<char, INET6_ADDRSTRLEN> text{};
  inet_ntop(family_, bytes_.data(), text.data(), text.size());
  return text.data();
}

std::string IpNetwork::GetText() const {
  return length_ == GetBits() ? GetAddressText() : GetAddressText() + "/" + std::to_string(length_);
}

} // namespace vornhost
