#include "host/wireless/adapter_config.h"

#include "host/packageserver/strict_json.h"
#include "host/utility/atomic_file.h"
#include "platform/utility.h"

#include <stdexcept>

namespace vornhost {

namespace {

std::string FileOf(const std::string &adapter) {
  return std::string(kWirelessFolder) + "/" + adapter + ".json";
}

} // namespace

Json::Value ReadAdapterConfig(const std::string &adapter) {
  const std::string path = FileOf(adapter);
  Json::Value config(Json::objectValue);
  if (QARDCFileExist(path.c_str()) != 0) {
    std::string content;
    if (ReadWholeFile(path.c_str(), content) != 0) {
      throw std::runtime_error(path + ": cannot be read");
    }
    if (!ParseStrictJson(content, config) || !config.isObject()) {
      throw std::runtime_error(path + ": no JSON object");
    }
  }
  if (!config.isMember(kPolicyMember)) {
    config[kPolicyMember] = kPolicyDisable;
  }
  if (!config.isMember(kListMember)) {
    config[kListMember] = Json::Value(Json::arrayValue);
  }
  return config;
}

} // namespace vornhost
