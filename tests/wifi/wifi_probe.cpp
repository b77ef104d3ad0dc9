// wifi_probe stations NETWORK | config ADAPTER
// Calls the wireless daemon's client as the module does, and prints what comes back as one line of JSON. Status 1: the
// call failed.
#include "platform/wifi.h"

#include <json/writer.h>

#include <cstdio>
#include <string>

int main(int argc, char **argv) {
  const std::string what = argc == 3 ? argv[1] : "";
  vornwireless::dbus::WifiClient client;
  Json::Value value;
  int result = -1;
  if (what == "stations") {
    result = client.GetConnectionList(argv[2], value);
  } else if (what == "config") {
    result = client.GetAdapterConfig(argv[2], value);
  } else {
    std::fputs("usage: wifi_probe stations NETWORK | config ADAPTER\n", stderr);
    return 2;
  }
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  std::puts(Json::writeString(builder, value).c_str());
  return result < 0 ? 1 : 0;
}
