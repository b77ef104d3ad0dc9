// A set of rules whose process is killed at each of its system calls: the module over the platform's library, with the
// real rc.network in its place.
#include "host/portforward/dnat.h"
#include "router/portforward.h"
#include "tests/host/files.h"
#include "tests/host/network/shell.h"
#include "tests/host/portforward/records.h"
#include "tests/host/traced_child.h"

#include <gmock/gmock.h>

#include <sstream>

namespace {

using hosttest::Rule;
using hosttest::Shell;
using hosttest::TracedChild;
using testing::AnyOf;
using testing::ElementsAre;
using testing::HasSubstr;

constexpr const char *kFolder = "/etc/portforward/routerpf";
constexpr const char *kRuleFile = "/etc/portforward/routerpf/rule.conf";

std::string Content(const char *port) {
  std::string out = "[0]\n";
  for (const auto &[key, value] : Rule(port, "tcp", "192.168.1.110", "80")) {
    out.append(key).append("=\"").append(value).append("\"\n");
  }
  return out;
}

int SetRules() {
  Json::Value data;
  Json::Value &rule = data["rules"][0];
  rule["enabled"] = true;
  rule["targetPort"] = "80";
  rule["targetIP"] = "192.168.1.110";
  rule["sourcePort"] = "82";
  rule["protocol"] = "tcp";
  rule["service"] = "s";
  return PortForward().SetPortForward(data) ? 0 : 1;
}

std::string Status() {
  std::ostringstream out;
  const bool agrees = vornhost::ShowDnatStatus(out);
  return (agrees ? "agrees: " : "differs: ") + out.str();
}

TEST(SetKilled, AtAnyStepTheRuleFileIsWholeAndTheNextStartMakesTheKernelAgree) {
  hosttest::RemoveLinks();
  Shell("ip link add lbr0 type bridge && ip addr add 192.168.1.1/24 dev lbr0 && ip link set lbr0 up");
  Shell(std::string("install -m 755 ") + RC_NETWORK + " /etc/rc.network");
  int kept = 0;
  int changed = 0;
  bool ended = false;
  for (int stops = 0; !ended; ++stops) {
    hosttest::FreshFolder(kFolder);
    hosttest::WriteText(kRuleFile, Content("81"));
    TracedChild child(SetRules);
    for (int step = 0; step <= stops && !ended; ++step) {
      ended = !child.Step();
    }
    if (!ended) {
      child.Kill();
    }
    const std::string content = hosttest::ReadText(kRuleFile);
    ASSERT_THAT(content, AnyOf(Content("81"), Content("82"))) << "stop " << stops;
    const bool isNew = content == Content("82");
    ASSERT_TRUE(isNew || !child.WasAcknowledged()) << "stop " << stops;
    (isNew ? changed : kept) += 1;
    ASSERT_TRUE(vornhost::StartDnat());
    ASSERT_THAT(Status(), HasSubstr(isNew ? "agrees: rule 0 \"s\": installed: tcp 82"
                                          : "agrees: rule 0 \"s\": installed: tcp 81"))
        << "stop " << stops;
  }
  RecordProperty("kept", kept);
  RecordProperty("changed", changed);
  EXPECT_GT(kept, 15);
  EXPECT_GT(changed, 15); // the wait for rc.network is among them
  EXPECT_EQ(SetRules(), 0);
  EXPECT_THAT(hosttest::NamesIn(kFolder), ElementsAre("rule.conf"));
}

} // namespace
