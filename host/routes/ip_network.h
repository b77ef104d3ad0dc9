// An IPv4 or IPv6 network, or a single address: as many leading bits as its length says.
#ifndef HOST_ROUTES_IP_NETWORK_H
#define HOST_ROUTES_IP_NETWORK_H

#include <array>
#include <optional>
#include <string>

namespace vornhost {

class IpNetwork {
public:
  /// @param[in] text    an address of the family, without prefix length and zone
  /// @return a single address; nothing when the text is none
  static std::optional<IpNetwork> Parse(const std::string &text, int family);

  /// @param[in] text  an address with the length of its subnet; without one it is a single address
  /// @return that subnet, the host's bits as they are; nothing when the text is none
  static std::optional<IpNetwork> ParseSubnet(const std::string &text, int family);

  /// @param[in] length  0 to GetBits(). The bits behind it stay as they are.
  IpNetwork WithLength(int length) const;

  int GetFamily() const { return family_; }
  int GetBits() const;
  int GetLength() const { return length_; }
  bool HasHostBits() const;
  /// Whether `other` is this network or a part of it.
  bool Contains(const IpNetwork &other) const;
  /// Whether the address is the IPv4 subnet's own or its broadcast address: no host has it. In one of two addresses or
  /// of one there is neither (RFC 3021).
  bool IsEdge(const IpNetwork &address) const;
  bool IsSameAddress(const IpNetwork &other) const { return family_ == other.family_ && bytes_ == other.bytes_; }
  /// The address in the kernel's form.
  std::string GetAddressText() const;
  /// As libnl writes it: a single address without a length.
  std::string GetText() const;

private:
  std::array<unsigned char, 16> Masked(int length) const;

  int family_ = 0;
  int length_ = 0;
  std::array<unsigned char, 16> bytes_{}; // network order
};

} // namespace vornhost

#endif
