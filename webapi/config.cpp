#include "webapi/config.h"

#include "webapi/text.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <filesystem>
#include <fstream>
#include <string_view>
#include <variant>
#include <vector>

namespace vornwebapi {
namespace {

constexpr const char *kDefaultFile = "/etc/vorn/webd.conf";

using Member = std::variant<std::string Config::*, bool Config::*, size_t Config::*, Milliseconds Config::*>;

struct Key {
  std::string_view name;
  Member member;
  size_t least; // numbers, and times in milliseconds
  size_t most;
  std::string_view meaning;
};

constexpr size_t kDay = 86'400'000;

constexpr std::array<Key, 38> kKeys = {{
    {"listen", &Config::listen, 0, 0, "address and port; port 0: any free one; [::1]:8080 for IPv6"},
    {"module", &Config::module, 0, 0, "the shared library to serve"},
    {"description", &Config::description, 0, 0, "what /openapi.json says of the module's rows, a JSON file"},
    {"host-names", &Config::hostNames, 0, 0, "names, beside localhost, that a request may have in Host"},
    {"state", &Config::state, 0, 0, "folder of the password, the tokens and the certificate"},
    {"page", &Config::page, 0, 0, "folder of the web page, read whole at the start; one that is not there: no page"},
    {"tls", &Config::tls, 0, 0, "yes: HTTPS, with a certificate that is made at the first start"},
    {"plain-http", &Config::plainHttp, 0, 0, "yes: HTTP without TLS may be served beyond loopback"},
    {"log-stderr", &Config::logToStandardError, 0, 0, "yes: log to the standard error stream too"},
    {"slots", &Config::slots, 1, 256, "calls in the module at once"},
    {"queue", &Config::queue, 0, 10'000, "calls that may wait for a slot; further ones get 503"},
    {"connections", &Config::connections, 1, 100'000, "open connections in all"},
    {"connections-per-address", &Config::connectionsPerAddress, 1, 100'000, "open connections from one address"},
    {"tls-connections", &Config::tlsConnections, 1, 100'000, "that speak TLS; then the one that waits longest is cut"},
    {"request-line-bytes", &Config::requestLineBytes, 64, 65'536, "longest request line, else 414"},
    {"header-bytes", &Config::headerBytes, 64, 65'536, "longest header after the request line, else 431"},
    {"header-fields", &Config::headerFields, 1, 1'000, "most header fields, else 431"},
    {"body-bytes", &Config::bodyBytes, 0, 16'777'216, "longest body, else 413"},
    {"login-body-bytes", &Config::loginBodyBytes, 256, 65'536, "longest body of a login and its like, else 413"},
    {"login-failures", &Config::loginFailures, 1, 1'000, "wrong passwords until each try has to wait, with 429"},
    {"login-delay", &Config::loginDelay, 10, kDay, "that wait"},
    {"login-queue", &Config::loginQueue, 0, 100, "logins that may wait for the one at work; further ones get 429"},
    {"sessions", &Config::sessions, 1, 10'000, "people logged in; then the longest silent one gives way"},
    {"session-idle-time", &Config::sessionIdleTime, 10, kDay, "a session ends after this without a call but polling"},
    {"session-time", &Config::sessionTime, 10, kDay, "a session ends after this"},
    {"json-depth", &Config::jsonDepth, 1, 64, "deepest nesting of parameters, else 400"},
    {"json-values", &Config::jsonValues, 1, 10'000'000, "most values in all parameters together, else 400"},
    {"handshake-time", &Config::handshakeTime, 10, kDay, "a new TLS connection must have begun to speak within this"},
    {"header-time", &Config::headerTime, 10, kDay, "from a request's first byte to the end of its header, else 408"},
    {"body-time", &Config::bodyTime, 10, kDay, "from there to the end of its body, else 408"},
    {"idle-time", &Config::idleTime, 10, kDay, "an open connection without a request is closed after this"},
    {"write-time", &Config::writeTime, 10, kDay, "a client that takes nothing of its answer is cut after this"},
    {"stop-time", &Config::stopTime, 0, kDay, "at the end, running calls and tasks are awaited so long"},
    {"tasks", &Config::tasks, 1, 256, "poll tasks in all"},
    {"task-keep-time", &Config::taskKeepTime, 10, kDay, "a finished task nobody asks for is dropped after this"},
    // Names that the command line alone knows.
    {"make-token", &Config::makeToken, 0, 0, "a name: makes a full token of 3650 days for root, prints it and ends"},
    {"config", Member{}, 0, 0, "this file"},
    {"help", Member{}, 0, 0, "prints this"},
}};

bool OfCommandLineOnly(const Key &key) {
  return key.name == "config" || key.name == "help" || key.name == "make-token";
}

/// The whole of `text` as a number.
bool ReadNumber(std::string_view text, size_t &out) {
  const auto [end, fault] = std::from_chars(text.data(), text.data() + text.size(), out);
  return fault == std::errc() && end == text.data() + text.size();
}

/// "500ms", "10s", "5m".
bool ReadTime(std::string_view text, size_t &milliseconds) {
  const size_t digits = std::min(text.find_first_not_of("0123456789"), text.size());
  const std::string_view unit = text.substr(digits);
  const size_t factor = unit == "ms" ? 1 : unit == "s" ? 1'000 : unit == "m" ? 60'000 : 0;
  size_t number = 0;
  if (factor == 0 || !ReadNumber(text.substr(0, digits), number) || number > kDay) {
    return false;
  }
  milliseconds = number * factor;
  return true;
}

bool ReadSwitch(std::string_view text, bool &out) {
  out = text == "yes";
  return out || text == "no";
}

/// @return what is wrong with the value; empty when it was set
std::string Set(const Key &key, std::string_view text, Config &config) {
  if (const auto *member = std::get_if<std::string Config::*>(&key.member)) {
    config.**member = text;
    return {};
  }
  if (const auto *member = std::get_if<bool Config::*>(&key.member)) {
    return ReadSwitch(text, config.**member) ? "" : "is neither yes nor no";
  }
  const auto *time = std::get_if<Milliseconds Config::*>(&key.member);
  size_t number = 0;
  if (time != nullptr ? !ReadTime(text, number) : !ReadNumber(text, number)) {
    return time != nullptr ? "is no time such as 500ms, 10s or 5m" : "is no number";
  }
  if (number < key.least || number > key.most) {
    return "is not within " + std::to_string(key.least) + " to " + std::to_string(key.most) +
           (time != nullptr ? " ms" : "");
  }
  if (time != nullptr) {
    config.**time = Milliseconds(number);
  } else {
    config.**std::get_if<size_t Config::*>(&key.member) = number;
  }
  return {};
}

std::string SetByName(std::string_view name, std::string_view text, bool inFile, Config &config) {
  const auto *key = std::find_if(kKeys.begin(), kKeys.end(), [name](const Key &each) { return each.name == name; });
  if (key == kKeys.end() || (inFile && OfCommandLineOnly(*key))) {
    return "unknown key \"" + std::string(name) + "\"";
  }
  const std::string fault = Set(*key, text, config);
  return fault.empty() ? "" : std::string(name) + ": \"" + std::string(text) + "\" " + fault;
}

std::string ReadFile(const std::string &path, Config &config) {
  std::ifstream file(path);
  if (!file) {
    return "cannot read " + path;
  }
  std::string line;
  for (int number = 1; std::getline(file, line); ++number) {
    const std::string_view text = Trim(line, " \t\r");
    if (text.empty() || text.front() == '#') {
      continue;
    }
    const size_t equals = text.find('=');
    const std::string fault = equals == std::string_view::npos ? "no key=value line"
                                                               : SetByName(Trim(text.substr(0, equals)),
                                                                           Trim(text.substr(equals + 1)), true, config);
    if (!fault.empty()) {
      return std::string(path).append(":").append(std::to_string(number)).append(": ").append(fault);
    }
  }
  return file.bad() ? "cannot read " + path : "";
}

struct Option {
  std::string name;
  std::string value;
};

/// "--name value" and "--name=value".
std::string ReadOptions(int argc, const char *const *argv, std::vector<Option> &options) {
  for (int at = 1; at < argc; ++at) {
    const std::string_view word = argv[at];
    if (word.substr(0, 2) != "--") {
      return "unexpected argument \"" + std::string(word) + "\"";
    }
    const size_t equals = word.find('=');
    Option option{std::string(word.substr(2, equals == std::string_view::npos ? equals : equals - 2)), ""};
    if (equals != std::string_view::npos) {
      option.value = word.substr(equals + 1);
    } else if (option.name != "help") {
      if (++at == argc) {
        return "--" + option.name + " without its value";
      }
      option.value = argv[at];
    }
    options.push_back(std::move(option));
  }
  return {};
}

std::string DefaultText(const Key &key) {
  const Config config;
  if (const auto *member = std::get_if<std::string Config::*>(&key.member)) {
    return config.**member;
  }
  if (const auto *member = std::get_if<bool Config::*>(&key.member)) {
    return config.**member ? "yes" : "no";
  }
  if (const auto *member = std::get_if<size_t Config::*>(&key.member)) {
    return std::to_string(config.**member);
  }
  return std::to_string((config.**std::get_if<Milliseconds Config::*>(&key.member)).count()) + "ms";
}

} // namespace

Start ReadConfig(int argc, const char *const *argv, Config &config, std::string &fault) {
  std::vector<Option> options;
  fault = ReadOptions(argc, argv, options);
  std::string file = std::filesystem::exists(kDefaultFile) ? kDefaultFile : "";
  for (const Option &option : options) {
    if (option.name == "help") {
      return Start::kHelp;
    }
    file = option.name == "config" ? option.value : file;
  }
  if (fault.empty() && !file.empty()) {
    fault = ReadFile(file, config);
  }
  for (const Option &option : options) {
    if (fault.empty() && option.name != "config") {
      fault = SetByName(option.name, option.value, false, config);
    }
  }
  if (fault.empty() && config.module.empty() && config.makeToken.empty()) {
    fault = "no module to serve: --module PATH";
  }
  return fault.empty() ? Start::kServe : Start::kRefused;
}

std::string DescribeKeys() {
  std::string out = "usage: vornwebd [--config FILE] [--KEY VALUE]...\n"
                    "Keys of the command line and, as key=value lines, of " +
                    std::string(kDefaultFile) + ":\n";
  for (const Key &key : kKeys) {
    std::string line = "  " + std::string(key.name);
    line.resize(std::max<size_t>(line.size() + 1, 28), ' ');
    line += key.meaning;
    if (!OfCommandLineOnly(key)) {
      line += " (" + DefaultText(key) + ")";
    }
    out += line + "\n";
  }
  return out;
}

} // namespace vornwebapi
