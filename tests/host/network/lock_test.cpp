// What may stand in the place of the lock file.
#include "host/network/topology_snapshot.h"
#include "tests/host/network/home.h"
#include "tests/host/network/shell.h"

#include <gmock/gmock.h>

#include <filesystem>

namespace {

namespace fs = std::filesystem;

using hosttest::Home;
using hosttest::kLock;
using hosttest::Picture;
using hosttest::ReadFile;
using hosttest::Shell;
using hosttest::WriteFile;
using testing::HasSubstr;

class Lock : public Home {
protected:
  // None of the commands follows, changes or removes it; only "start" goes on without it.
  void ExpectLeftAlone() {
    const std::string before = Picture();
    const std::string listed = Shell("ls -ld --time-style=full-iso /tmp/topology.lock");
    EXPECT_EQ(Run("switch bridge"), 1);
    EXPECT_EQ(Run("recover"), 1);
    EXPECT_EQ(Run("start"), 0);
    EXPECT_EQ(Picture(), before);
    EXPECT_EQ(Shell("ls -ld --time-style=full-iso /tmp/topology.lock"), listed);
  }

  // Nobody holds it, and it says nothing: the network is made what the files say.
  void ExpectCleared(const std::string &content) {
    Shell("ip link set lan2 nomaster && ip address flush dev lbr0 scope global");
    WriteFile(kLock, content);
    EXPECT_EQ(Run("recover"), 0);
    EXPECT_FALSE(fs::exists(kLock));
    EXPECT_THAT(Shell("ip link show lan2"), HasSubstr("master lbr0"));
    EXPECT_THAT(Picture(), HasSubstr("address lbr0 192.168.1.1/24"));
    EXPECT_THAT(Picture(), HasSubstr("address eth0 203.0.113."));
  }
};

TEST_F(Lock, SymbolicLink) {
  WriteFile("/tmp/victim", "mine");
  fs::create_symlink("/tmp/victim", kLock);
  ExpectLeftAlone();
  EXPECT_EQ(ReadFile("/tmp/victim"), "mine");
}

TEST_F(Lock, LinkToNothing) {
  fs::create_symlink("/tmp/nothing", kLock);
  ExpectLeftAlone();
  EXPECT_FALSE(fs::exists("/tmp/nothing"));
}

TEST_F(Lock, HardLinkToAnotherFile) {
  WriteFile("/tmp/victim", "mine");
  fs::create_hard_link("/tmp/victim", kLock);
  ExpectLeftAlone();
  EXPECT_EQ(ReadFile("/tmp/victim"), "mine");
}

TEST_F(Lock, Folder) {
  fs::create_directory(kLock);
  ExpectLeftAlone();
}

TEST_F(Lock, NamedPipe) {
  Shell("mkfifo /tmp/topology.lock");
  ExpectLeftAlone();
}

TEST_F(Lock, AnotherUsersFile) {
  Shell("touch /tmp/topology.lock && chown 1234 /tmp/topology.lock");
  ExpectLeftAlone();
}

TEST_F(Lock, FileThatOthersMayWrite) {
  Shell("touch /tmp/topology.lock && chmod 666 /tmp/topology.lock");
  ExpectLeftAlone();
}

TEST_F(Lock, EmptyFile) {
  ExpectCleared("");
}

TEST_F(Lock, TextThatIsNoJson) {
  ExpectCleared("garbage {");
}

TEST_F(Lock, NulBytes) {
  ExpectCleared(std::string(4096, '\0'));
}

TEST_F(Lock, JsonOfAnotherKind) {
  ExpectCleared(R"({"from": 1, "links": "no"})");
}

TEST_F(Lock, DeepJson) {
  ExpectCleared(std::string(100000, '['));
}

TEST_F(Lock, SwitchClearsAnEmptyOneFirst) {
  WriteFile(kLock, "");
  EXPECT_EQ(Run("switch bridge"), 0);
  EXPECT_FALSE(fs::exists(kLock));
  EXPECT_THAT(Picture(), HasSubstr("DHCP client on br0"));
}

TEST_F(Lock, RecoverWithoutOneDoesNothing) {
  const std::string before = Picture();
  EXPECT_EQ(Run("recover"), 0);
  EXPECT_EQ(Picture(), before);
}

// The interfaces of another boot say nothing; the file is put back, and "start" brings the network up by it.
TEST_F(Lock, SnapshotOfAnotherBoot) {
  ASSERT_EQ(Run("switch bridge"), 0);
  vornhost::Netlink netlink;
  vornhost::Snapshot snapshot = vornhost::TakeSnapshot(netlink, "router", "bridge", "");
  snapshot.boot = "00000000-0000-0000-0000-000000000000";
  snapshot.wanFile = "DEVICE=eth0\nBOOTPROTO=dhcp\nSLAVE=no\n";
  WriteFile(kLock, vornhost::SnapshotText(snapshot));
  EXPECT_EQ(Run("recover"), 0);
  EXPECT_FALSE(fs::exists(kLock));
  EXPECT_EQ(ReadFile(hosttest::kWanFile), "DEVICE=eth0\nBOOTPROTO=dhcp\nSLAVE=no\n");
  EXPECT_THAT(Picture(), HasSubstr("address br0 ")); // left to "start"
  EXPECT_EQ(Run("start"), 0);
  EXPECT_THAT(Picture(), HasSubstr("address lbr0 192.168.1.1/24"));
  EXPECT_THAT(Picture(), HasSubstr("DHCP client on eth0"));
}

} // namespace
