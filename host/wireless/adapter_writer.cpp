#include "host/wireless/adapter_writer.h"

#include "host/network/names.h"
#include "host/utility/atomic_file.h"
#include "host/utility/folder.h"
#include "host/utility/log.h"
#include "host/wireless/adapter_config.h"
#include "host/wireless/control_socket.h"
#include "host/wireless/file_changes.h"
#include "host/wireless/mac_filter.h"
#include "host/wireless/network_acl.h"
#include "host/wireless/stations.h"
#include "host/wireless/untold.h"
#include "platform/utility.h"

#include <sys/stat.h>

#include <algorithm>
#include <chrono>
#include <set>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

namespace vornhost {

namespace {

// What a change that failed may take beyond kAnswerLimit, to be taken back.
constexpr std::chrono::milliseconds kUndoLimit{1500};
constexpr std::chrono::milliseconds kLastWordLimit{500};

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

// A network with what its hostapd had before a change.
struct OldNetwork {
  const WirelessNetwork *network;
  NetworkAcl acl;
};

// What the running hostapd has is what it read when it started: it does not tell. An owner's own lines count too.
std::vector<OldNetwork> ReadOldNetworks(const WirelessAdapter &adapter) {
  std::vector<OldNetwork> networks;
  for (const WirelessNetwork &network : adapter.networks) {
    std::string content;
    if (ReadWholeFile(network.file.c_str(), content) != 0) {
      throw std::runtime_error(network.file + ": cannot be read");
    }
    networks.push_back({&network, ParseNetworkAcl(content, network.name)});
  }
  return networks;
}

// Before anything is changed, so that one that hangs is not left with a filter that is changed when it goes on.
void CheckAnswers(const WirelessAdapter &adapter, Deadline deadline) {
  for (const WirelessNetwork &network : adapter.networks) {
    ControlSocket control(network.control, deadline);
    if (!control.IsAbsent() && !Answers(control)) {
      throw std::runtime_error(network.name + ": hostapd does not answer");
    }
  }
}

// @param[out] told  how many networks were told something
void TellHostapd(const WirelessAdapter &adapter, const MacFilter &filter, Deadline deadline, size_t &told) {
  const FilterFiles files = FilterFilesOf(adapter.name);
  const NetworkAcl acl{std::to_string(MacaddrAclOf(filter)), {files.accept}, {files.deny}};
  for (const WirelessNetwork &network : adapter.networks) {
    ControlSocket control(network.control, deadline);
    ++told;
    if (control.IsAbsent()) {
      continue;
    }
    if (!TellAcl(control, acl) || !ThrowOut(control, filter)) {
      throw std::runtime_error(network.name + ": hostapd does not take the MAC filter");
    }
  }
}

// REQUIRES: the old files are back. The network that failed is the last, so that the others have their lists before it
// can use the time up. One that answers but does not take its lists has the old policy as the last word: a network with
// a list of those who may connect stays shut; one without it is open to those it denied, but not shut to the home.
// @return those that were not told the whole
std::vector<OldNetwork> TellOldFilter(std::vector<OldNetwork> networks) {
  const Deadline deadline = std::chrono::steady_clock::now() + kUndoLimit;
  const auto isRestored = [](const OldNetwork &old, Deadline until, bool (*tell)(ControlSocket &, const NetworkAcl &)) {
    ControlSocket control(old.network->control, until);
    return control.IsAbsent() || (Answers(control) && tell(control, old.acl));
  };
  networks.erase(
      std::remove_if(networks.begin(), networks.end(),
                     [&isRestored, deadline](const OldNetwork &old) { return isRestored(old, deadline, TellAcl); }),
      networks.end());
  const Deadline last = std::chrono::steady_clock::now() + kLastWordLimit;
  for (const OldNetwork &old : networks) {
    const char *left =
        isRestored(old, last, TellPolicy) ? "the old policy without its lists" : "a part of a MAC filter";
    LogError("%s: hostapd has %s until it answers and is told again", old.network->name.c_str(), left);
  }
  return networks;
}

std::vector<std::string> NamesOf(const std::vector<OldNetwork> &networks) {
  std::vector<std::string> names;
  std::transform(networks.begin(), networks.end(), std::back_inserter(names),
                 [](const OldNetwork &old) { return old.network->name; });
  return names;
}

// What was owed to a network before the change is owed to it still, unless it was told.
// @param[in] noted  for this change alone
void TakeBack(std::vector<OldNetwork> before, size_t told, const std::vector<std::string> &noted) {
  before.resize(told);
  std::vector<std::string> done = NamesOf(before);
  done.insert(done.end(), noted.begin(), noted.end());
  const std::vector<std::string> left = NamesOf(TellOldFilter(std::move(before)));
  for (const std::string &name : done) {
    if (std::find(left.begin(), left.end(), name) == left.end()) {
      StrikeOutUntold(name);
    }
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

void WriteAdapter(const WirelessAdapter &adapter, const Json::Value &config) {
  const MacFilter filter = ParseMacFilter(config);
  const std::string text = RenderAdapterConfig(config);
  CheckSockets(adapter);
  MakeFolder("/etc/vorn", 0755);
  MakeFolder(kWirelessFolder, 0700); // who is in a list is nobody's business
  const UniqueFd turn = TakeHostapdTurn();
  std::vector<OldNetwork> before = ReadOldNetworks(adapter);
  const Deadline deadline = std::chrono::steady_clock::now() + kAnswerLimit;
  CheckAnswers(adapter, deadline);
  const auto left = deadline - std::chrono::steady_clock::now(); // the disk's time is not hostapd's
  const std::vector<std::string> noted = NoteUntold(NamesOf(before));
  FileChanges changes;
  size_t told = 0;
  try {
    WriteFiles(adapter, filter, text, changes);
    TellHostapd(adapter, filter, std::chrono::steady_clock::now() + left, told);
  } catch (...) {
    changes.Undo();
    TakeBack(std::move(before), told, noted);
    throw;
  }
  for (const OldNetwork &network : before) {
    StrikeOutUntold(network.network->name);
  }
}

} // namespace vornhost
