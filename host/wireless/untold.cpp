#include "host/wireless/untold.h"

#include "host/network/interface_name.h"
#include "host/network/names.h"
#include "host/utility/atomic_file.h"
#include "host/utility/folder.h"
#include "host/utility/log.h"
#include "host/wireless/control_socket.h"
#include "host/wireless/hostapd_config.h"
#include "host/wireless/network_acl.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <stdexcept>

namespace vornhost {

namespace {

namespace fs = std::filesystem;

constexpr std::chrono::milliseconds kPatience{1000};

std::string NoteOf(const std::string &network) {
  return std::string(kUntoldFolder) + "/" + network;
}

// @return whether nothing is owed to it any more
bool Tell(const WirelessNetwork &network) {
  std::string content;
  if (ReadWholeFile(network.file.c_str(), content) != 0) {
    return false;
  }
  ControlSocket control(network.control, std::chrono::steady_clock::now() + kPatience);
  if (control.IsAbsent()) {
    return true;
  }
  if (!Answers(control) || !TellAcl(control, ParseNetworkAcl(content, network.name))) {
    return false;
  }
  LogInfo("%s: hostapd answers again and has the MAC filter of its file", network.name.c_str());
  return true;
}

} // namespace

std::vector<std::string> NoteUntold(const std::vector<std::string> &networks) {
  MakeFolder(kUntoldFolder, 0700);
  std::vector<std::string> fresh;
  for (const std::string &network : networks) {
    const UniqueFd note(open(NoteOf(network).c_str(), O_CREAT | O_EXCL | O_WRONLY | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (note.IsOpen()) {
      fresh.push_back(network);
    } else if (errno != EEXIST) {
      throw std::runtime_error(NoteOf(network) + ": " + std::strerror(errno));
    }
  }
  return fresh;
}

void StrikeOutUntold(const std::string &network) {
  unlink(NoteOf(network).c_str());
}

std::vector<std::string> UntoldNetworks() {
  std::vector<std::string> names;
  std::error_code failed;
  for (fs::directory_iterator entry(kUntoldFolder, failed), end; !failed && entry != end; entry.increment(failed)) {
    if (IsInterfaceName(entry->path().filename().string())) {
      names.push_back(entry->path().filename());
    }
  }
  std::sort(names.begin(), names.end());
  return names;
}

void TellUntold() {
  const UniqueFd turn = TakeHostapdTurn(); // whoever has it now may be about to tell them
  const std::vector<WirelessAdapter> adapters = ReadAdapters();
  for (const std::string &name : UntoldNetworks()) {
    const WirelessNetwork *network = FindNetwork(adapters, name);
    if (network == nullptr || Tell(*network)) {
      StrikeOutUntold(name);
    }
  }
}

} // namespace vornhost
