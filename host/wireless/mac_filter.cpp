#include "host/wireless/mac_filter.h"

#include "host/network/mac_address.h"
#include "host/utility/log.h"
#include "host/wireless/adapter_config.h"

#include <stdexcept>

namespace vornhost {

namespace {

FilterPolicy ParsePolicy(const Json::Value &value) {
  const std::string text = value.isString() ? value.asString() : "";
  if (text == kPolicyDisable) {
    return FilterPolicy::kDisable;
  }
  if (text == kPolicyAllow) {
    return FilterPolicy::kAllow;
  }
  if (text == kPolicyDeny) {
    return FilterPolicy::kDeny;
  }
  throw std::runtime_error("no such policy of a MAC filter: \"" + LogText(text) + "\"");
}

std::string ParseEntryMac(const Json::Value &value) {
  const std::string text = value.isString() ? value.asString() : "";
  const auto mac = ParseMac(text);
  if (!mac || !IsStationMac(*mac)) {
    throw std::runtime_error("no MAC address of a station: \"" + LogText(text) + "\"");
  }
  return *mac;
}

bool IsOn(const Json::Value &value) {
  if (!value.isNull() && !value.isBool()) {
    throw std::runtime_error("an entry's mac_filter_enabled is no truth value");
  }
  return value.isNull() || value.asBool();
}

} // namespace

bool MacFilter::Permits(const std::string &mac) const {
  const bool listed = macs.count(mac) != 0;
  switch (policy) {
  case FilterPolicy::kAllow:
    return listed;
  case FilterPolicy::kDeny:
    return !listed;
  case FilterPolicy::kDisable:
    break;
  }
  return true;
}

MacFilter ParseMacFilter(const Json::Value &config) {
  if (!config.isObject()) {
    throw std::runtime_error("a configuration that is no object");
  }
  const Json::Value &list = config[kListMember];
  if (!list.isArray()) {
    throw std::runtime_error("a MAC filter's list that is no array");
  }
  MacFilter filter;
  filter.policy = ParsePolicy(config[kPolicyMember]);
  for (const Json::Value &entry : list) {
    if (!entry.isObject()) {
      throw std::runtime_error("an entry of a MAC filter that is no object");
    }
    if (!entry["desc"].isNull() && !entry["desc"].isString()) {
      throw std::runtime_error("an entry's desc is no text");
    }
    std::string mac = ParseEntryMac(entry["mac"]);
    if (IsOn(entry["mac_filter_enabled"])) {
      filter.macs.insert(std::move(mac));
    }
  }
  return filter;
}

std::string RenderMacList(const std::set<std::string> &macs) {
  std::string text = "# Made from the adapter's configuration; changes here are lost.\n";
  for (const std::string &mac : macs) {
    text += mac + "\n";
  }
  return text;
}

} // namespace vornhost
