#include "host/wireless/adapter_writer.h"

#include "host/network/names.h"
#include "host/utility/line_file.h"
#include "host/utility/log.h"
#include "host/wireless/adapter_config.h"
#include "host/wireless/control_socket.h"
#include "host/wireless/file_changes.h"
#include "host/wireless/mac_filter.h"
#include "host/wireless/stations.h"
#include "platform/utility.h"

#include <sys/stat.h>

#include <algorithm>
#include <set>
#include <stdexcept>
#include <utility>

namespace vornhost {

namespace {

struct FilterFiles {
  std::string accept;
  std::string deny;
};

FilterFiles FilterFilesOf(const std::string &adapter) {
  const std::string begin = std::string(kWirelessFolder) + "/" + adapter;
  return {begin + ".accept", begin + ".deny"};
}

int MacaddrAclOf(const MacFilter &filter) {
  return filter.policy == FilterPolicy::kAllow ? 1 : 0;
}

bool IsFilterLine(std::string_view line) {
  const std::string_view key = line.substr(0, line.find('='));
  return key == "macaddr_acl" || key == "accept_mac_file" || key == "deny_mac_file";
}

bool BeginsNetwork(std::string_view line) {
  const std::string_view key = line.substr(0, line.find('='));
  return key == "interface" || key == "bss";
}

void WriteList(const MacFilter &filter, FilterPolicy which, const FilterFiles &files, FileChanges &changes) {
  const bool used = filter.policy == which;
  std::string content = RenderMacList(used ? filter.macs : std::set<std::string>());
  changes.Replace(which == FilterPolicy::kAllow ? files.accept : files.deny,
                  [&content](const std::string &) { return content; });
}

void WriteHostapdFiles(const WirelessAdapter &adapter, const FilterFiles &files, int macaddrAcl, FileChanges &changes) {
  std::set<std::string> paths;
  for (const WirelessNetwork &network : adapter.networks) {
    paths.insert(network.file);
  }
  for (const std::string &path : paths) {
    changes.Replace(path, [&files, macaddrAcl](const std::string &old) {
      return WithFilterLines(old, files.accept, files.deny, macaddrAcl);
    });
  }
}

// First the list that the new policy uses, then the policy, then the list that it does not use: a hostapd that starts
// in between, or after a loss of power, never has an open network because its list is not there yet or not there any
// more.
void WriteFiles(const WirelessAdapter &adapter, const MacFilter &filter, const std::string &config,
                FileChanges &changes) {
  const FilterFiles files = FilterFilesOf(adapter.name);
  for (const auto &[which, path] : {std::pair(FilterPolicy::kAllow, files.accept), {FilterPolicy::kDeny, files.deny}}) {
    if (filter.policy == which || QARDCFileExist(path.c_str()) != 1) { // without the file hostapd does not start
      WriteList(filter, which, files, changes);
    }
  }
  WriteHostapdFiles(adapter, files, MacaddrAclOf(filter), changes);
  for (const FilterPolicy which : {FilterPolicy::kAllow, FilterPolicy::kDeny}) {
    if (filter.policy != which) {
      WriteList(filter, which, files, changes);
    }
  }
  changes.Replace(AdapterFileOf(adapter.name), [&config](const std::string &) { return config; });
}

// hostapd takes the lists from the files in one request each, however long they are. While they are empty everybody is
// let in (with macaddr_acl 1 hostapd would throw everybody out); who came in then is thrown out with the others. The
// removal of an address that is in no list makes hostapd hand the lists to a driver that filters by itself.
bool TellLists(ControlSocket &control, const FilterFiles &files, int macaddrAcl) {
  const std::string requests[] = {"SET macaddr_acl 0",
                                  "ACCEPT_ACL CLEAR",
                                  "DENY_ACL CLEAR",
                                  "SET accept_mac_file " + files.accept,
                                  "SET deny_mac_file " + files.deny,
                                  "SET macaddr_acl " + std::to_string(macaddrAcl),
                                  "DENY_ACL DEL_MAC 00:00:00:00:00:00"};
  return std::all_of(std::begin(requests), std::end(requests),
                     [&control](const std::string &request) { return control.Do(request); });
}

// Deauthenticated, not only disassociated: an authenticated station could associate again without being looked up.
bool ThrowOut(ControlSocket &control, const MacFilter &filter) {
  const auto stations = ListStations(control);
  if (!stations) {
    return false;
  }
  return std::all_of(stations->begin(), stations->end(), [&control, &filter](const Station &station) {
    return filter.Permits(station.mac) || control.Ask("DEAUTHENTICATE " + station.mac);
  });
}

void TellHostapd(const WirelessAdapter &adapter, const MacFilter &filter, Deadline deadline) {
  const FilterFiles files = FilterFilesOf(adapter.name);
  for (const WirelessNetwork &network : adapter.networks) {
    ControlSocket control(network.control, deadline);
    if (control.IsAbsent()) {
      continue;
    }
    if (!TellLists(control, files, MacaddrAclOf(filter)) || !ThrowOut(control, filter)) {
      throw std::runtime_error(network.name + ": hostapd does not take the MAC filter");
    }
  }
}

// What hostapd was told before, as far as it can be said.
MacFilter StoredFilter(const std::string &adapter) {
  try {
    return ParseMacFilter(ReadAdapterConfig(adapter));
  } catch (const std::runtime_error &) {
    return {};
  }
}

void CheckSockets(const WirelessAdapter &adapter) {
  for (const WirelessNetwork &network : adapter.networks) {
    if (network.control.empty()) {
      throw std::runtime_error(network.file + ": the network " + network.name + " has no ctrl_interface");
    }
  }
}

} // namespace

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

void WriteAdapter(const WirelessAdapter &adapter, const Json::Value &config) {
  const MacFilter filter = ParseMacFilter(config);
  const std::string text = RenderAdapterConfig(config);
  CheckSockets(adapter);
  mkdir("/etc/vorn", 0755);
  mkdir(kWirelessFolder, 0700); // who is in a list is nobody's business
  const UniqueFd turn = TakeHostapdTurn();
  const MacFilter before = StoredFilter(adapter.name);
  const Deadline deadline = std::chrono::steady_clock::now() + kAnswerLimit;
  FileChanges changes;
  try {
    WriteFiles(adapter, filter, text, changes);
    TellHostapd(adapter, filter, deadline);
  } catch (...) {
    changes.Undo();
    try {
      TellHostapd(adapter, before, deadline);
    } catch (const std::runtime_error &error) {
      LogError("the old MAC filter is not applied: %s", LogText(error.what()).c_str());
    }
    throw;
  }
}

} // namespace vornhost
