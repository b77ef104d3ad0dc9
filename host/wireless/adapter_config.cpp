#include "host/wireless/adapter_config.h"

#include "host/network/names.h"
#include "host/packageserver/strict_json.h"
#include "host/utility/atomic_file.h"
#include "platform/utility.h"

#include <json/writer.h>

#include <stdexcept>

namespace vornhost {

Json::Value ReadAdapterConfig(const std::string &adapter) {
  const std::string path = AdapterFileOf(adapter);
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

std::string RenderAdapterConfig(Json::Value config) {
  config.removeMember(kEnabledMember);
  config.removeMember(kGuestEnabledMember);
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "\t";
  builder["emitUTF8"] = true; // bytes as they are, so that what is no UTF-8 is found
  std::string text = Json::writeString(builder, config) + "\n";
  if (text.size() > kFileLimit) {
    throw std::runtime_error("a configuration that is too large");
  }
  Json::Value back;
  if (!ParseStrictJson(text, back) || Json::writeString(builder, back) + "\n" != text) {
    throw std::runtime_error("a configuration that cannot be stored as it is");
  }
  return text;
}

std::string AdapterFileOf(const std::string &adapter) {
  return std::string(kWirelessFolder) + "/" + adapter + ".json";
}

} // namespace vornhost
