// vorndevices watch                  finds the devices of the home, for ever
// vorndevices list [TYPE]            prints them as a table; TYPE: all, arp, dhcp, mdns, upnp, netbios, wifi
// vorndevices json [TYPE]            prints them as the platform's contract gives them
// vorndevices name MAC NAME TYPE     gives a device the owner's name and type
// vorndevices forget MAC             forgets a device, the owner's name and type too
// Ends with 0 when it is done, 1 when it could not be, 2 for a wrong call.
#include "platform/netclient.h"

#include "host/devices/scanner.h"

#include <json/writer.h>
#include <syslog.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <exception>
#include <iostream>
#include <string>
#include <vector>

namespace {

using Arguments = std::vector<std::string>;

// Whether the time, local and in the contract's form, is no more than a minute ago.
bool IsOnline(const std::string &text) {
  tm local{};
  local.tm_isdst = -1;
  if (strptime(text.c_str(), "%T %Y/%m/%d", &local) == nullptr) {
    return false;
  }
  return std::difftime(time(nullptr), mktime(&local)) <= vornhost::kOnlineSeconds;
}

std::string TextOf(const Json::Value &entry, const char *userKey, const char *key) {
  return entry[entry.isMember(userKey) ? userKey : key].asString();
}

void PrintRow(const Arguments &row) {
  static constexpr int kWidths[] = {7, 17, 15, 6, 24, 14, 24, 24};
  for (size_t i = 0; i + 1 < row.size(); ++i) {
    std::printf("%-*s ", kWidths[i], row[i].c_str());
  }
  std::printf("%s\n", row.back().c_str());
}

int Show(const std::string &type, bool asJson) {
  Json::Value result;
  if (vornnetwork::dbus::NetClient().GetDeviceListData(type, result) != 0) {
    return 1;
  }
  if (asJson) {
    std::cout << result.toStyledString();
    return 0;
  }
  PrintRow({"state", "mac", "ip", "netif", "name", "type", "maker", "model", "seen"});
  for (const Json::Value &entry : result["ClientList"]) {
    const std::string seen = entry["asso_time"].asString();
    PrintRow({IsOnline(seen) ? "online" : "-", entry["macAddr"].asString(), entry["ipAddr"].asString(),
              entry["netif"].asString(), TextOf(entry, "userdef_displayName", "displayName"),
              TextOf(entry, "userdef_deviceType", "deviceType"), entry["manufacturer"].asString(),
              entry["modelName"].asString(), seen});
  }
  return 0;
}

int Name(const Arguments &arguments) {
  Json::Value record;
  record["macAddr"] = arguments[1];
  record["userdef_displayName"] = arguments[2];
  record["userdef_deviceType"] = arguments[3];
  return vornnetwork::dbus::NetClient().SetDeviceListData(record) == 0 ? 0 : 1;
}

int Run(const Arguments &arguments) {
  const std::string command = arguments.empty() ? "" : arguments[0];
  const size_t count = arguments.size();
  if (command == "watch" && count == 1) {
    vornhost::Scanner().Run();
    return 0;
  }
  if ((command == "list" || command == "json") && count <= 2) {
    return Show(count == 2 ? arguments[1] : "all", command == "json");
  }
  if (command == "name" && count == 4) {
    return Name(arguments);
  }
  if (command == "forget" && count == 2) {
    return vornnetwork::dbus::NetClient().DelDeviceListData(arguments[1]) == 0 ? 0 : 1;
  }
  std::fputs("usage: vorndevices watch | list [TYPE] | json [TYPE] | name MAC NAME TYPE | forget MAC\n", stderr);
  return 2;
}

} // namespace

int main(int argc, char **argv) {
  openlog("vorndevices", LOG_PID, LOG_DAEMON);
  try {
    return Run(Arguments(argv + 1, argv + argc));
  } catch (const std::exception &error) {
    syslog(LOG_ERR, "%s", error.what());
    std::fprintf(stderr, "vorndevices: %s\n", error.what());
    return 1;
  }
}
