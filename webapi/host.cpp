#include "webapi/host.h"

#include "webapi/text.h"

#include <algorithm>
#include <boost/asio/ip/address.hpp>

namespace vornwebapi {
namespace {

namespace ip = boost::asio::ip;

bool IsPort(std::string_view text) {
  return text.size() <= 5 && text.find_first_not_of("0123456789") == std::string_view::npos;
}

/// Splits host:port and [v6]:port.
bool Split(std::string_view value, std::string &host, bool &bracketed) {
  bracketed = !value.empty() && value.front() == '[';
  const size_t end = bracketed ? value.find(']') : value.find(':');
  if (bracketed && end == std::string_view::npos) {
    return false;
  }
  host = bracketed ? value.substr(1, end - 1) : value.substr(0, end);
  std::string_view rest = end == std::string_view::npos ? "" : value.substr(bracketed ? end + 1 : end);
  if (!rest.empty() && rest.front() == ':') {
    rest.remove_prefix(1);
    return !host.empty() && IsPort(rest);
  }
  return rest.empty() && !host.empty();
}

bool IsNameCharacter(char c) {
  return IsAlphanumeric(c) || c == '-' || c == '.' || c == '_';
}

} // namespace

HostVerdict CheckHostValue(std::string_view value, const std::vector<std::string> &names, std::string_view ownAddress) {
  std::string host;
  bool bracketed = false;
  if (!Split(value, host, bracketed)) {
    return HostVerdict::kMalformed;
  }
  boost::system::error_code fault;
  const ip::address address = ip::make_address(host, fault);
  if (!fault && address.is_v6() == bracketed) {
    return address.is_loopback() || address.to_string() == ownAddress ? HostVerdict::kOwn : HostVerdict::kForeign;
  }
  host = Lower(host);
  if (bracketed || !std::all_of(host.begin(), host.end(), IsNameCharacter)) {
    return HostVerdict::kMalformed;
  }
  return std::find(names.begin(), names.end(), host) != names.end() ? HostVerdict::kOwn : HostVerdict::kForeign;
}

} // namespace vornwebapi
