// Multicast DNS (RFC 6762): the questions that the scanner asks, and what it takes from an answer.
#ifndef HOST_DEVICES_DNS_MESSAGE_H
#define HOST_DEVICES_DNS_MESSAGE_H

#include "host/devices/device.h"

#include <string>
#include <string_view>
#include <vector>

namespace vornhost {

/// One question message for the services of devices (RFC 6763), all in one.
std::string ServiceQuestion();

/// One question message for the names of addresses.
/// @param[in] addresses  IPv4, in host order; at most 32
std::string ReverseQuestion(const std::vector<uint32_t> &addresses);

/// What an answer says of the host that sent it: the name that it gives its own address, its kind by its services, its
/// model. A message that is malformed anywhere counts up to there; a question says nothing.
/// @param[in] sender  its IPv4 address, in host order: a name of another address is not its own
Finding ParseAnswer(std::string_view message, uint32_t sender);

} // namespace vornhost

#endif
