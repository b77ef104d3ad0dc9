// Messages as devices send them, built by hand.
#ifndef TESTS_HOST_DEVICES_PACKETS_H
#define TESTS_HOST_DEVICES_PACKETS_H

#include <cstdint>
#include <string>
#include <vector>

namespace hosttest {

inline std::string Number(unsigned value) {
  return {static_cast<char>(value >> 8U), static_cast<char>(value & 0xffU)};
}

/// Labels as they stand, so that a label may hold anything.
inline std::string DnsName(const std::vector<std::string> &labels) {
  std::string name;
  for (const std::string &label : labels) {
    name += static_cast<char>(label.size());
    name += label;
  }
  return name + '\0';
}

inline std::string DnsRecord(const std::string &name, unsigned type, const std::string &data) {
  return name + Number(type) + Number(0x8001) + std::string("\0\0\0\x78", 4) +
         Number(static_cast<unsigned>(data.size())) + data;
}

inline std::string DnsAnswer(const std::vector<std::string> &records) {
  std::string message =
      Number(0) + Number(0x8400) + Number(0) + Number(static_cast<unsigned>(records.size())) + Number(0) + Number(0);
  for (const std::string &record : records) {
    message += record;
  }
  return message;
}

struct NetbiosName {
  std::string name; // padded to 15 here
  unsigned suffix = 0;
  bool group = false;
  bool active = true;
};

inline std::string NodeStatus(unsigned id, const std::vector<NetbiosName> &names) {
  std::string message = Number(id) + Number(0x8400) + Number(0) + Number(1) + Number(0) + Number(0);
  message += " CK" + std::string(30, 'A') + '\0' + Number(0x21) + Number(1) + std::string(4, '\0');
  std::string body(1, static_cast<char>(names.size()));
  for (const NetbiosName &each : names) {
    std::string padded = each.name;
    padded.resize(15, ' ');
    body += padded + static_cast<char>(each.suffix) + Number((each.group ? 0x8000U : 0U) | (each.active ? 0x400U : 0U));
  }
  return message + Number(static_cast<unsigned>(body.size())) + body + std::string(46, '\0');
}

} // namespace hosttest

#endif
