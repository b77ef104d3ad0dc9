#include "tests/router/network_files.h"

#include <gtest/gtest.h>

#include <sys/mount.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <sstream>

namespace fs = std::filesystem;

namespace scripted {
namespace {

const std::string kNetFolder = "/tmp/proc-net";
const std::string kReplies = "/tmp/netbios";
const std::string kCalls = "/tmp/nmblookup.calls";
const std::string kNmblookup = "/usr/bin/nmblookup";

void Write(const std::string &path, const std::string &text) {
  std::ofstream file(path, std::ios::binary | std::ios::trunc);
  file << text;
  ASSERT_TRUE(file.flush().good()) << path;
}

std::string Read(const std::string &path) {
  std::ostringstream out;
  out << std::ifstream(path, std::ios::binary).rdbuf();
  return out.str();
}

// A mount on a single file of /proc/net would go with the next look-up; the folder itself keeps one.
void TakeOverProcNet() {
  fs::create_directories(kNetFolder);
  static const int kMounted = mount(kNetFolder.c_str(), "/proc/self/net", nullptr, MS_BIND, nullptr);
  ASSERT_EQ(kMounted, 0) << std::strerror(errno);
}

} // namespace

std::string NeighbourLine(const std::string &ip, const std::string &mac, const std::string &netif,
                          const std::string &flags) {
  return ip + "      0x1         " + flags + "         " + mac + "     *        " + netif + "\n";
}

void PutNeighbours(const std::string &text) {
  TakeOverProcNet();
  Write(kNetFolder + "/arp", text);
}

void RemoveNeighbours() {
  TakeOverProcNet();
  fs::remove(kNetFolder + "/arp");
}

void PutNmblookup() {
  fs::remove_all(kReplies);
  fs::create_directories(kReplies);
  fs::remove(kCalls);
  fs::remove(kNmblookup);
  Write(kNmblookup, "#!/bin/sh\nIFS='|'\nprintf '%s\\n' \"$*\" >> " + kCalls + "\ncat \"" + kReplies +
                        "/$2\" 2> /dev/null\nexit 1\n");
  fs::permissions(kNmblookup, fs::perms::owner_all | fs::perms::group_exec | fs::perms::others_exec);
}

void PutNetBiosReply(const std::string &ip, const std::string &text) {
  Write(kReplies + "/" + ip, text);
}

std::vector<std::string> TakeNmblookupCalls() {
  std::vector<std::string> calls;
  std::ifstream file(kCalls);
  for (std::string line; std::getline(file, line);) {
    calls.push_back(line);
  }
  fs::remove(kCalls);
  return calls;
}

void PutNameFile(const std::string &text) {
  RemoveNameFile();
  Write(kNameFile, text);
}

std::string ReadNameFile() {
  return Read(kNameFile);
}

void RemoveNameFile() {
  fs::remove_all(kNameFile);
}

} // namespace scripted
