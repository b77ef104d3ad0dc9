#include "host/wireless/network_acl.h"

#include "host/utility/line_file.h"

#include <algorithm>

namespace vornhost {

namespace {

constexpr std::string_view kPolicyKey = "macaddr_acl";
constexpr std::string_view kAcceptKey = "accept_mac_file";
constexpr std::string_view kDenyKey = "deny_mac_file";

std::string_view KeyOf(std::string_view line) {
  return line.substr(0, line.find('='));
}

std::string ValueOf(std::string_view line) {
  const size_t equals = line.find('=');
  return std::string(equals == std::string_view::npos ? std::string_view() : line.substr(equals + 1));
}

bool IsFilterLine(std::string_view line) {
  const std::string_view key = KeyOf(line);
  return key == kPolicyKey || key == kAcceptKey || key == kDenyKey;
}

bool BeginsNetwork(std::string_view line) {
  const std::string_view key = KeyOf(line);
  return key == "interface" || key == "bss";
}

void TakeLine(std::string_view line, NetworkAcl &acl) {
  const std::string_view key = KeyOf(line);
  if (key == kPolicyKey) {
    acl.macaddrAcl = ValueOf(line);
  } else if (key == kAcceptKey) {
    acl.acceptFiles.push_back(ValueOf(line));
  } else if (key == kDenyKey) {
    acl.denyFiles.push_back(ValueOf(line));
  }
}

std::string PolicyRequest(const NetworkAcl &acl) {
  return "SET macaddr_acl " + acl.macaddrAcl;
}

} // namespace

NetworkAcl ParseNetworkAcl(std::string_view content, const std::string &network) {
  NetworkAcl acl;
  bool isIn = false;
  LineReader lines(content);
  for (std::string_view line; lines.Next(line);) {
    if (BeginsNetwork(line)) {
      isIn = ValueOf(line) == network;
    } else if (isIn) {
      TakeLine(line, acl);
    }
  }
  return acl;
}

std::string WithFilterLines(std::string_view content, const std::string &acceptFile, const std::string &denyFile,
                            int macaddrAcl) {
  const std::string added = "macaddr_acl=" + std::to_string(macaddrAcl) + "\naccept_mac_file=" + acceptFile +
                            "\ndeny_mac_file=" + denyFile + "\n";
  std::string out;
  LineReader lines(content);
  for (std::string_view line; lines.Next(line);) {
    if (IsFilterLine(line)) {
      continue;
    }
    out.append(line).append("\n");
    if (BeginsNetwork(line)) {
      out += added;
    }
  }
  return out;
}

bool Answers(ControlSocket &control) {
  return control.Ask("PING") == "PONG\n";
}

// hostapd takes the lists from the files in one request each, however long they are, and adds them to those that it
// has. So they are emptied first, and under macaddr_acl 2: with 0 everybody could come in meanwhile, with 1 hostapd
// would throw everybody out. (Where the network has a RADIUS server, for WPA-Enterprise, that is asked about who comes
// in these milliseconds.) The removal of an address that is in no list makes hostapd throw out whom macaddr_acl 1 does
// not accept, and hand the lists to a driver that filters by itself.
bool TellAcl(ControlSocket &control, const NetworkAcl &acl) {
  std::vector<std::string> requests = {"SET macaddr_acl 2", "ACCEPT_ACL CLEAR", "DENY_ACL CLEAR"};
  for (const std::string &file : acl.acceptFiles) {
    requests.push_back("SET accept_mac_file " + file);
  }
  for (const std::string &file : acl.denyFiles) {
    requests.push_back("SET deny_mac_file " + file);
  }
  requests.push_back(PolicyRequest(acl));
  requests.emplace_back("ACCEPT_ACL DEL_MAC 00:00:00:00:00:00");
  return std::all_of(requests.begin(), requests.end(),
                     [&control](const std::string &request) { return control.Do(request); });
}

bool TellPolicy(ControlSocket &control, const NetworkAcl &acl) {
  return control.Do(PolicyRequest(acl));
}

} // namespace vornhost
