// Changes of the MAC filter, looked at between any two system calls: a hostapd that started there, after a loss of
// power, would let nobody in whom both the old and the new filter keep out.
#include "tests/host/traced_child.h"
#include "tests/host/wireless/apply_fixture.h"

#include <optional>
#include <set>
#include <sstream>

namespace {

using hosttest::Apply;
using hosttest::Config;
using hosttest::kFolder;
using hosttest::kLaptop;
using hosttest::kPhone;
using hosttest::ReadText;
using WifiApplySteps = hosttest::WifiApply;

constexpr char kStranger[] = "02:00:00:00:09:00";

using Macs = std::set<std::string>;

// @return nothing when there is no such file
std::optional<Macs> ReadList(const std::string &path) {
  const std::string text = ReadText(path);
  if (text == "<no file>") {
    return std::nullopt;
  }
  Macs macs;
  std::istringstream lines(text);
  for (std::string line; std::getline(lines, line);) {
    if (line[0] != '#') {
      macs.insert(line);
    }
  }
  return macs;
}

// Who may connect to a hostapd that starts with the files as they are, by hostapd.conf(5). It does not start without a
// list that its configuration names.
Macs PermittedNow() {
  std::string policy = "0";
  Macs accept;
  Macs deny;
  std::istringstream lines(ReadText("/etc/hostapd/wlan0.conf"));
  for (std::string line; std::getline(lines, line);) {
    const std::string key = line.substr(0, line.find('='));
    const std::string value = line.substr(std::min(line.size(), key.size() + 1));
    if (key == "macaddr_acl") {
      policy = value;
    } else if (key == "accept_mac_file" || key == "deny_mac_file") {
      const auto list = ReadList(value);
      if (!list) {
        return {};
      }
      (key == "accept_mac_file" ? accept : deny) = *list;
    }
  }
  Macs permitted;
  for (const char *mac : {kPhone, kLaptop, kStranger}) {
    if (accept.count(mac) != 0 || (deny.count(mac) == 0 && policy == "0")) {
      permitted.insert(mac);
    }
  }
  return permitted;
}

// The same by what was set.
Macs PermittedBy(const Json::Value &config) {
  const std::string policy = config["mac_filter_policy"].asString();
  Macs permitted;
  for (const char *mac : {kPhone, kLaptop, kStranger}) {
    bool listed = false;
    for (const Json::Value &entry : config["mac_filter_list"]) {
      listed = listed || entry["mac"].asString() == mac;
    }
    if (policy == "disable" || listed == (policy == "allow")) {
      permitted.insert(mac);
    }
  }
  return permitted;
}

Json::Value &Wanted() {
  static Json::Value config;
  return config;
}

Macs Union(const Macs &one, const Macs &two) {
  Macs both = one;
  both.insert(two.begin(), two.end());
  return both;
}

const std::vector<Json::Value> &Filters() {
  static const std::vector<Json::Value> filters = {Json::Value(), // none yet
                                                   Config("disable", {kPhone}),
                                                   Config("allow", {kPhone}),
                                                   Config("allow", {kLaptop}),
                                                   Config("allow", {}),
                                                   Config("deny", {kPhone}),
                                                   Config("deny", {kLaptop}),
                                                   Config("deny", {kPhone, kLaptop})};
  return filters;
}

TEST_F(WifiApplySteps, NoStepOfAnyChangeOpensTheNetwork) {
  int changes = 0;
  for (const Json::Value &from : Filters()) {
    for (const Json::Value &to : Filters()) {
      if (to.isNull()) {
        continue;
      }
      SetUp();
      hosttest::WriteHostapdConfig("wlan0");
      ASSERT_TRUE(from.isNull() || Apply("wlan0", from) >= 0);
      const Macs before = PermittedNow();
      Wanted() = to;
      std::vector<Macs> seen;
      hosttest::TracedChild child([] { return Apply("wlan0", Wanted()) >= 0 ? 0 : -1; });
      while (child.Step()) {
        seen.push_back(PermittedNow());
      }
      ASSERT_TRUE(child.WasAcknowledged());
      ASSERT_EQ(PermittedNow(), PermittedBy(to));
      const Macs either = Union(before, PermittedBy(to));
      for (size_t step = 0; step < seen.size(); ++step) {
        ASSERT_EQ(Union(either, seen[step]), either)
            << "step " << step << " from " << from.toStyledString() << " to " << to.toStyledString();
      }
      ASSERT_GT(seen.size(), 50U);
      ++changes;
    }
  }
  EXPECT_EQ(changes, 56);
}

} // namespace
