// vornroutes restore | watch | status
// Makes the kernel's static routes and default routes what the files in /etc/iproute2/config say: once, or at every
// change of the network from now on. status prints, as JSON, the rules and the gateways of both families and how they
// stand. Ends with 0 when all is done, 1 when something could not be, 2 for a wrong call.
#include "platform/netclient.h"
#include "platform/network.h"

#include "host/routes/route_follower.h"
#include "host/utility/log.h"

#include <json/writer.h>
#include <syslog.h>

#include <cstdio>
#include <cstring>
#include <exception>
#include <iostream>

namespace {

int Restore() {
  const std::vector<std::string> failures = vornhost::RestoreRoutes();
  for (const std::string &failure : failures) {
    const std::string text = vornhost::LogText(failure);
    vornhost::LogError("routes: %s", text.c_str());
    std::fprintf(stderr, "vornroutes: %s\n", text.c_str());
  }
  return failures.empty() ? 0 : 1;
}

int ShowStatus() {
  Json::Value status;
  vornnetwork::dbus::NetClient client;
  vornnetwork::network::StaticRoute service;
  const bool done = client.GetGatewayListData(Json::Value(), status["gateways"]) >= 0 &&
                    service.GetRules(vornnetwork::network::IP_TYPE_V4, status["ipv4"]) >= 0 &&
                    service.GetRules(vornnetwork::network::IP_TYPE_V6, status["ipv6"]) >= 0;
  std::cout << status.toStyledString();
  return done ? 0 : 1;
}

int Run(const char *command) {
  if (std::strcmp(command, "restore") == 0) {
    return Restore();
  }
  if (std::strcmp(command, "watch") == 0) {
    vornhost::RouteFollower().Follow();
  }
  if (std::strcmp(command, "status") == 0) {
    return ShowStatus();
  }
  return 2;
}

} // namespace

int main(int argc, char **argv) {
  openlog("vornroutes", LOG_PID, LOG_DAEMON);
  int result = 2;
  try {
    result = argc == 2 ? Run(argv[1]) : 2;
  } catch (const std::exception &error) {
    const std::string text = vornhost::LogText(error.what());
    vornhost::LogError("%s", text.c_str());
    std::fprintf(stderr, "vornroutes: %s\n", text.c_str());
    return 1;
  }
  if (result == 2) {
    std::fputs("usage: vornroutes restore | watch | status\n", stderr);
  }
  return result;
}
