#include "host/routes/rule_store.h"

#include "host/network/names.h"
#include "host/packageserver/strict_json.h"
#include "host/routes/route_rule.h"
#include "host/utility/atomic_file.h"
#include "host/utility/file_turn.h"
#include "host/utility/folder.h"
#include "host/utility/line_file.h"
#include "platform/utility.h"

#include <json/writer.h>
#include <sys/socket.h>
#include <sys/stat.h>

#include <algorithm>
#include <chrono>
#include <stdexcept>

namespace vornhost {

namespace {

constexpr char kFolder[] = "/etc/iproute2/config";

std::string FileOf(const char *name, int family) {
  return std::string(kFolder) + "/" + name + (family == AF_INET6 ? "-v6" : "");
}

[[noreturn]] void Fail(const std::string &what, const char *why) {
  throw std::runtime_error(what + ": " + why);
}

std::string ReadOrEmpty(const std::string &path) {
  std::string content;
  if (QARDCFileExist(path.c_str()) == 1 && ReadWholeFile(path.c_str(), content) != 0) {
    Fail(path, "cannot be read");
  }
  return content;
}

void Write(const std::string &path, const std::string &content) {
  MakeFolder("/etc/iproute2", 0755);
  MakeFolder(kFolder, 0755);
  const auto render = [&content](const std::string &, std::string &fresh) {
    fresh = content;
    return 0;
  };
  if (ChangeFile(path.c_str(), render) != 0) {
    Fail(path, "cannot be written");
  }
}

} // namespace

UniqueFd TakeRouteTurn() {
  mkdir(kRunFolder, 0700); // whoever could open it could hold every change up
  return TakeFileTurn(std::string(kRunFolder) + "/routes.lock", std::chrono::seconds(30));
}

Json::Value ReadRules(int family) {
  const std::string path = FileOf("static-route", family);
  const std::string content = ReadOrEmpty(path);
  Json::Value rules(Json::arrayValue);
  if (!content.empty() && !(ParseStrictJson(content, rules) && rules.isArray())) {
    Fail(path, "no list of rules");
  }
  return rules;
}

void WriteRules(int family, const Json::Value &rules) {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  std::string content;
  for (const Json::Value &rule : rules) {
    content += content.empty() ? "[\n" : ",\n";
    content += Json::writeString(builder, rule);
  }
  Write(FileOf("static-route", family), content.empty() ? "[]\n" : content + "\n]\n");
}

std::vector<std::string> ReadGatewayOrder(int family) {
  const std::string content = ReadOrEmpty(FileOf("gateway-order", family));
  std::vector<std::string> names;
  LineReader lines(content);
  for (std::string_view line; lines.Next(line);) {
    const std::string name(line);
    const bool isRepeated = std::find(names.begin(), names.end(), name) != names.end();
    if (IsRoutableName(name) && !isRepeated && names.size() < kGatewayLimit) {
      names.push_back(name);
    }
  }
  return names;
}

void WriteGatewayOrder(int family, const std::vector<std::string> &names) {
  std::string content;
  for (const std::string &name : names) {
    content += name + "\n";
  }
  Write(FileOf("gateway-order", family), content);
}

} // namespace vornhost
