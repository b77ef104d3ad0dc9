// The server's settings: each is a key of the configuration file and an option of the command line.
#ifndef WEBAPI_CONFIG_H
#define WEBAPI_CONFIG_H

#include <chrono>
#include <cstddef>
#include <string>

namespace vornwebapi {

using Milliseconds = std::chrono::milliseconds;

/// config.cpp has the table of keys, with what each means and the range that it may take.
struct Config {
  std::string listen = "127.0.0.1:8080";
  std::string module;
  std::string description;
  std::string hostNames; ///< blank-separated
  std::string state = "/var/lib/vorn";
  std::string page = "/usr/share/vorn/page";
  bool tls = false;
  bool plainHttp = false;
  bool logToStandardError = false;

  size_t slots = 16;
  size_t queue = 64;
  size_t connections = 10240;
  size_t connectionsPerAddress = 64;
  size_t tlsConnections = 512;

  size_t requestLineBytes = 8192;
  size_t headerBytes = 8192;
  size_t headerFields = 100;
  size_t bodyBytes = 1048576;
  size_t jsonDepth = 64;
  size_t jsonValues = 50000;

  size_t loginBodyBytes = 4096;
  size_t loginFailures = 10;
  size_t loginQueue = 8;
  size_t sessions = 32;
  Milliseconds loginDelay{60'000};
  Milliseconds sessionIdleTime{600'000};
  Milliseconds sessionTime{86'400'000};
  std::string makeToken; ///< its name: not served, the token is made

  Milliseconds handshakeTime{15'000};
  Milliseconds headerTime{10'000};
  Milliseconds bodyTime{15'000};
  Milliseconds idleTime{15'000};
  Milliseconds writeTime{15'000};
  Milliseconds stopTime{5'000};

  size_t tasks = 8;
  Milliseconds taskKeepTime{300'000};
};

/// What the command line asks for.
enum class Start { kServe, kHelp, kRefused };

/// Reads the command line and the file that it names, or the default one when that exists. The command line wins.
/// @param[out] config  the settings
/// @param[out] fault   with kRefused: one line that names what is wrong
Start ReadConfig(int argc, const char *const *argv, Config &config, std::string &fault);

/// Every key with its default, for --help.
std::string DescribeKeys();

} // namespace vornwebapi

#endif
