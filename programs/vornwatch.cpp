// vornwatch
// Keeps the DHCP clients and wpa_supplicant running, and tells a hostapd that fell silent the MAC filter that it was
// not told, when it answers again. Ends only with a signal, or with status 1 when the changes of the network cannot be
// followed any more.
#include "host/utility/log.h"
#include "host/watch/watcher.h"

#include <syslog.h>
#include <unistd.h>

#include <cstdio>
#include <exception>

int main(int argc, char **) {
  if (argc != 1) {
    std::fputs("usage: vornwatch\n", stderr);
    return 2;
  }
  openlog("vornwatch", LOG_PID | (isatty(STDERR_FILENO) == 1 ? LOG_PERROR : 0), LOG_DAEMON);
  try {
    vornhost::Watcher().Run();
  } catch (const std::exception &error) {
    vornhost::LogError("%s", vornhost::LogText(error.what()).c_str());
  }
  return 1;
}
