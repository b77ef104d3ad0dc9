// From the files to the kernel's table.
#include "host/nftables/nftables.h"
#include "host/portforward/dnat.h"
#include "platform/portforward.h"
#include "tests/host/files.h"
#include "tests/host/network/shell.h"
#include "tests/host/portforward/records.h"
#include "tests/host/utility/syslog_record.h"

#include <gmock/gmock.h>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/wait.h>
#include <unistd.h>

#include <sstream>

namespace {

using hosttest::Rule;
using hosttest::Shell;
using hosttest::TakeLogLines;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr const char *kRuleFile = "/etc/portforward/routerpf/rule.conf";
constexpr const char *kDmzFile = "/etc/portforward/routerpf/dmz.conf";

struct Status {
  bool agrees;
  std::string text;
};

Status GetStatus() {
  std::ostringstream out;
  const bool agrees = vornhost::ShowDnatStatus(out);
  return {agrees, out.str()};
}

std::set<std::string> Installed() {
  std::set<std::string> comments;
  EXPECT_TRUE(vornhost::Nftables().ReadComments("ip vorn_dnat", comments));
  return comments;
}

class Dnat : public testing::Test {
protected:
  void SetUp() override {
    hosttest::RemoveLinks();
    Shell("ip link add lbr0 type bridge && ip addr add 192.168.1.1/24 dev lbr0 && ip link set lbr0 up");
    hosttest::Status("nft delete table ip vorn_dnat 2>/dev/null");
    hosttest::FreshFolder("/etc/portforward/routerpf");
    hosttest::FreshFolder("/etc/vorn");
    std::filesystem::remove_all("/run/vorn");
    TakeLogLines();
  }
  static void Store(const std::vector<hosttest::Pairs> &rules) {
    hosttest::Records records;
    for (const auto &rule : rules) {
      records.emplace_back(std::to_string(records.size()), rule);
    }
    ASSERT_EQ(VORNPFConfSet(hosttest::MakeList(records).get(), kRuleFile), 0);
  }
};

TEST_F(Dnat, InstallsTheValidRulesAndTellsOfTheOthers) {
  Store({Rule("81", "tcp", "192.168.1.110", "80", "1", "Web"), Rule("65536", "tcp", "192.168.1.110", "80", "1", "High"),
         Rule("8080", "tcp", "192.168.1.110", "80", "1", "Mine"),
         Rule("81", "both", "192.168.1.111", "80", "1", "Again"),
         Rule("5000-5010", "udp", "192.168.1.111", "6000-6010", "1", "Game"),
         Rule("99", "udp", "192.168.1.111", "99", "0", "Off")});
  hosttest::WriteText(kDmzFile, "enabled=\"yes\"\ndmz_ip=\"192.168.1.112\"\n");
  ASSERT_TRUE(vornhost::StartDnat());
  EXPECT_THAT(Installed(), ElementsAre("DMZ 192.168.1.112", "rule 0 tcp 81 -> 192.168.1.110:80",
                                       "rule 4 udp 5000-5010 -> 192.168.1.111:6000-6010"));
  EXPECT_THAT(
      TakeLogLines(),
      ElementsAre("3 rule 1 \"High\" left out: sourcePort \"65536\": no port from 1 to 65535 and no range of them",
                  "3 rule 2 \"Mine\" left out: sourcePort \"8080\": has the router's management port 8080",
                  "3 rule 3 \"Again\" left out: sourcePort \"81\": rule 0 \"Web\" has 81"));
  const Status status = GetStatus();
  EXPECT_TRUE(status.agrees);
  EXPECT_EQ(status.text,
            "rule 0 \"Web\": installed: tcp 81 -> 192.168.1.110:80\n"
            "rule 1 \"High\": left out: sourcePort \"65536\": no port from 1 to 65535 and no range of them\n"
            "rule 2 \"Mine\": left out: sourcePort \"8080\": has the router's management port 8080\n"
            "rule 3 \"Again\": left out: sourcePort \"81\": rule 0 \"Web\" has 81\n"
            "rule 4 \"Game\": installed: udp 5000-5010 -> 192.168.1.111:6000-6010\n"
            "rule 5 \"Off\": disabled\n"
            "DMZ: installed: 192.168.1.112\n");
}

TEST_F(Dnat, WithoutFilesNothingIsForwarded) {
  std::filesystem::remove_all("/etc/portforward");
  ASSERT_TRUE(vornhost::StartDnat());
  EXPECT_THAT(Installed(), IsEmpty());
  EXPECT_THAT(TakeLogLines(), IsEmpty());
  EXPECT_EQ(GetStatus().text, "DMZ: off\n");
}

TEST_F(Dnat, EachStartReplacesWhatWasInstalled) {
  Store({Rule("81", "tcp", "192.168.1.110", "80"), Rule("82", "tcp", "192.168.1.110", "80")});
  ASSERT_TRUE(vornhost::StartDnat());
  Store({Rule("82", "tcp", "192.168.1.111", "80")});
  ASSERT_TRUE(vornhost::StartDnat());
  EXPECT_THAT(Installed(), ElementsAre("rule 0 tcp 82 -> 192.168.1.111:80"));
  Store({});
  ASSERT_TRUE(vornhost::StartDnat());
  EXPECT_THAT(Installed(), IsEmpty());
}

TEST_F(Dnat, StatusTellsOfATableThatIsNotWhatIsStored) {
  Store({Rule("81", "both", "192.168.1.110", "80", "1", "Web")});
  Status status = GetStatus();
  EXPECT_FALSE(status.agrees);
  EXPECT_EQ(status.text, "rule 0 \"Web\": NOT INSTALLED: tcp/udp 81 -> 192.168.1.110:80\nDMZ: off\n");
  ASSERT_TRUE(vornhost::StartDnat());
  Store({});
  status = GetStatus();
  EXPECT_FALSE(status.agrees);
  EXPECT_EQ(status.text, "DMZ: off\ninstalled, but not stored: rule 0 tcp 81 -> 192.168.1.110:80\n"
                         "installed, but not stored: rule 0 udp 81 -> 192.168.1.110:80\n");
}

TEST_F(Dnat, OtherTablesAreLeftAlone) {
  Shell("nft add table ip mine && nft add chain ip mine c && nft add rule ip mine c drop");
  Store({Rule("81", "tcp", "192.168.1.110", "80")});
  ASSERT_TRUE(vornhost::StartDnat());
  EXPECT_THAT(Shell("nft list table ip mine"), HasSubstr("drop"));
  Shell("nft delete table ip mine");
}

TEST_F(Dnat, RuleFileThatCannotBeTrustedChangesNothing) {
  Store({Rule("81", "tcp", "192.168.1.110", "80")});
  ASSERT_TRUE(vornhost::StartDnat());
  Store({});
  ASSERT_EQ(chmod(kRuleFile, 0666), 0);
  TakeLogLines();
  EXPECT_FALSE(vornhost::StartDnat());
  EXPECT_THAT(TakeLogLines(), ElementsAre(HasSubstr("no plain file of root's alone"),
                                          "3 /etc/portforward/routerpf/rule.conf cannot be read: error 0x0400"));
  EXPECT_THAT(Installed(), ElementsAre("rule 0 tcp 81 -> 192.168.1.110:80"));
  EXPECT_FALSE(GetStatus().agrees);
}

TEST_F(Dnat, DmzFileThatCannotBeReadChangesNothing) {
  Store({Rule("81", "tcp", "192.168.1.110", "80")});
  ASSERT_TRUE(vornhost::StartDnat());
  hosttest::WriteText(kDmzFile, std::string("enabled=\"yes\"\0\n", 15));
  EXPECT_FALSE(vornhost::StartDnat());
  EXPECT_THAT(Installed(), ElementsAre("rule 0 tcp 81 -> 192.168.1.110:80"));
}

TEST_F(Dnat, CutRuleFileInstallsItsWholeRules) {
  hosttest::WriteText(kRuleFile, "[0]\nenabled=\"1\"\ns_port=\"80\"\ns_ip=\"192.168.1.110\"\nr_port=\"81\"\n"
                                 "protocol name=\"tcp\"\nservice=\"Web\"\n[1]\nenabled=\"1\"\ns_port=\"80\"\n"
                                 "s_ip=\"192.168.1.111\"\nprotocol name=\"tcp\"\nr_port=\"80");
  ASSERT_TRUE(vornhost::StartDnat());
  EXPECT_THAT(Installed(), ElementsAre("rule 0 tcp 81 -> 192.168.1.110:80"));
}

TEST_F(Dnat, KernelThatRefusesLeavesTheOldRules) {
  Store({Rule("81", "tcp", "192.168.1.110", "80")});
  ASSERT_TRUE(vornhost::StartDnat());
  // A chain of that name with another hook: the kernel takes no other definition of it.
  Shell("nft 'add table ip vorn_dnat; delete chain ip vorn_dnat postrouting; add chain ip vorn_dnat postrouting "
        "{ type filter hook output priority 0; }'");
  Store({Rule("82", "tcp", "192.168.1.110", "80")});
  TakeLogLines();
  EXPECT_FALSE(vornhost::StartDnat());
  EXPECT_THAT(TakeLogLines(), ElementsAre(HasSubstr("3 nftables: ")));
  EXPECT_THAT(Installed(), ElementsAre("rule 0 tcp 81 -> 192.168.1.110:80"));
}

TEST_F(Dnat, ManagementPortIsWhatTheServersConfigurationSays) {
  hosttest::WriteText("/etc/vorn/webd.conf", "# listen=1.2.3.4:81\nlisten=[::1]:82\nlisten_tls = 0.0.0.0:443\n");
  Store({Rule("82", "tcp", "192.168.1.110", "1"), Rule("443", "tcp", "192.168.1.110", "1"),
         Rule("81", "tcp", "192.168.1.110", "1"), Rule("8080", "tcp", "192.168.1.110", "1")});
  ASSERT_TRUE(vornhost::StartDnat());
  EXPECT_THAT(Installed(), ElementsAre("rule 2 tcp 81 -> 192.168.1.110:1", "rule 3 tcp 8080 -> 192.168.1.110:1"));
}

TEST_F(Dnat, StartsTakeTurns) {
  ASSERT_TRUE(vornhost::StartDnat());
  const int lock = open("/run/vorn/dnat.lock", O_RDWR | O_CLOEXEC);
  ASSERT_EQ(flock(lock, LOCK_EX), 0);
  Store({Rule("81", "tcp", "192.168.1.110", "80")});
  const pid_t child = fork();
  if (child == 0) {
    close(lock);
    _exit(vornhost::StartDnat() ? 0 : 1);
  }
  hosttest::Sleep(200);
  EXPECT_THAT(Installed(), IsEmpty());
  // What is stored while it waits is what it installs.
  Store({Rule("82", "tcp", "192.168.1.110", "80")});
  close(lock);
  int status = 0;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0);
  EXPECT_THAT(Installed(), ElementsAre("rule 0 tcp 82 -> 192.168.1.110:80"));
}

TEST_F(Dnat, EveryPortOfBothProtocolsCanBeShifted) {
  Store({Rule("1-8079", "both", "192.168.1.110", "10001-18079"), Rule("8081-65535", "tcp", "192.168.1.111", "1-57455"),
         Rule("8080-65535", "udp", "192.168.1.111", "1-57456")});
  ASSERT_TRUE(vornhost::StartDnat());
  EXPECT_EQ(Installed().size(), 4U);
}

TEST_F(Dnat, OneThousandRulesOfWhichSomeAreBadAreInstalled) {
  std::vector<hosttest::Pairs> rules;
  for (int i = 0; i < 1000; ++i) {
    const std::string port = i % 10 == 9 ? "0" : std::to_string(10000 + i);
    rules.push_back(Rule(port.c_str(), "tcp", "192.168.1.110", "80"));
  }
  Store(rules);
  ASSERT_TRUE(vornhost::StartDnat());
  EXPECT_EQ(Installed().size(), 900U);
  EXPECT_EQ(TakeLogLines().size(), 100U);
}

} // namespace
