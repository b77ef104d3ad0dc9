// A router of two interfaces for the tests of the routes, in the private network that they run in.
//
//   lan0  192.168.7.1/24  fd00:7::1/64      its other end: lan0p
//   wan0  10.9.0.2/24     fd00:9::2/64      its other end: wan0p
//   wan1  10.8.0.2/24     fd00:8::2/64      its other end: wan1p
#ifndef TESTS_HOST_ROUTES_SCENE_H
#define TESTS_HOST_ROUTES_SCENE_H

#include "platform/network.h"

#include <gtest/gtest.h>
#include <json/value.h>

#include <functional>
#include <string>
#include <sys/types.h>

namespace hosttest {

class RoutesTest : public testing::Test {
protected:
  void SetUp() override;
};

Json::Value Parse(const std::string &text);
/// One line of JSON.
std::string Text(const Json::Value &value);

/// A rule of each family, well formed.
Json::Value Rule4(const std::string &ip, const std::string &mask, const std::string &gateway,
                  const std::string &ifname = "lan0", bool enabled = true);
Json::Value Rule6(const std::string &ip, const std::string &length, const std::string &gateway,
                  const std::string &ifname = "lan0", bool enabled = true);
/// As many rules as that, of networks 10.128.0.0/24 and on, by one gateway.
Json::Value ManyRules(unsigned count, const std::string &gateway);

template <typename... Rest> Json::Value List(const Json::Value &first, const Rest &...rest) {
  Json::Value list(Json::arrayValue);
  list.append(first);
  (list.append(rest), ...);
  return list;
}

int SetRules(const Json::Value &rules, vornnetwork::network::IP_TYPE type = vornnetwork::network::IP_TYPE_V4);
Json::Value GetRules(vornnetwork::network::IP_TYPE type = vornnetwork::network::IP_TYPE_V4);

/// The static routes as the kernel has them, sorted, a line each; of every other route as well.
std::string OwnRoutes(const char *family = "-4");
std::string AllRoutes();
/// Both families' rule files and every route: what must not change when a change is refused.
std::string Everything();

/// A process that does something until it is killed.
class Child {
public:
  explicit Child(const std::function<void()> &work);
  ~Child() { Kill(); }
  Child(const Child &) = delete;
  Child &operator=(const Child &) = delete;
  void Kill();

private:
  pid_t pid_;
};

} // namespace hosttest

#endif
