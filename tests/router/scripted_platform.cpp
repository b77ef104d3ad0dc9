#include "tests/router/scripted_platform.h"

#include "platform/interface.h"
#include "platform/netclient.h"
#include "platform/network.h"
#include "platform/packageserver.h"
#include "platform/utility.h"
#include "platform/wifi.h"

#include <gtest/gtest.h>
#include <json/reader.h>
#include <json/writer.h>

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <memory>
#include <syslog.h>

namespace scripted {
namespace {

std::unique_ptr<Platform> current = std::make_unique<Platform>();

void Record(std::string call) {
  current->calls.push_back(std::move(call));
}

} // namespace

Platform &Get() {
  return *current;
}

void Reset() {
  current = std::make_unique<Platform>();
}

int Call(const std::string &call, int normal) {
  Record(call);
  const auto found = current->results.find(call);
  return found == current->results.end() ? normal : found->second;
}

Lines Join(std::initializer_list<Lines> parts) {
  Lines out;
  for (const Lines &part : parts) {
    out.insert(out.end(), part.begin(), part.end());
  }
  return out;
}

std::string Text(const Json::Value &value) {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  return Json::writeString(builder, value);
}

Json::Value Parse(const std::string &text) {
  Json::Value value;
  std::string errors;
  const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  EXPECT_TRUE(reader->parse(text.data(), text.data() + text.size(), &value, &errors)) << errors;
  return value;
}

} // namespace scripted

using scripted::Get;
using scripted::Record;
using scripted::Text;

// The framework.

struct VORN::APIRequest::State {
  Json::Value parameters;
};

struct VORN::APIResponse::State {
  std::vector<std::string> answers;
  std::vector<std::pair<void (*)(void *), void *>> callbacks;
};

namespace VORN {

bool APIRequest::HasParam(const std::string &name) const {
  Record("HasParam(" + name + ")");
  return state_->parameters.isMember(name);
}

Json::Value APIRequest::GetParam(const std::string &name, const Json::Value &fallback) const {
  Record("GetParam(" + name + ", " + Text(fallback) + ")");
  return name.empty() ? state_->parameters : state_->parameters.get(name, fallback);
}

std::string APIRequest::GetUILanguage() const {
  Record("GetUILanguage()");
  return Get().language;
}

void APIResponse::SetSuccess(const Json::Value &data) {
  state_->answers.push_back("SetSuccess(" + Text(data) + ")");
  Record(state_->answers.back());
}

void APIResponse::SetError(int code, const Json::Value &data) {
  state_->answers.push_back("SetError(" + std::to_string(code) + ", " + Text(data) + ")");
  Record(state_->answers.back());
}

void APIResponse::SetCallbackFunc(void (*function)(void *), void *data) {
  Record("SetCallbackFunc()");
  state_->callbacks.emplace_back(function, data);
}

} // namespace VORN

namespace scripted {

struct Exchange::Parts {
  VORN::APIRequest::State requestState;
  VORN::APIResponse::State responseState;
  VORN::APIRequest request{requestState};
  VORN::APIResponse response{responseState};
};

Exchange::Exchange(Json::Value parameters) : parts_(new Parts) {
  parts_->requestState.parameters = std::move(parameters);
}

Exchange::~Exchange() {
  RunCallbacks(); // the framework always runs them, and what they own is freed by them
  delete parts_;
}

void Exchange::Run(VORN::APIHandler handler) {
  parts_->responseState.answers.clear();
  handler(&parts_->request, &parts_->response);
}

void Exchange::RunTask() {
  parts_->responseState.answers.clear();
  Get().startedTask(&parts_->request, &parts_->response, Get().startedContext);
}

void Exchange::RunCallbacks() {
  for (const auto &[function, data] : std::exchange(parts_->responseState.callbacks, {})) {
    function(data);
  }
}

const std::string &Exchange::Answer() const {
  static const std::string kNone = "(no answer)";
  return parts_->responseState.answers.empty() ? kNone : parts_->responseState.answers.back();
}

size_t Exchange::AnswerCount() const {
  return parts_->responseState.answers.size();
}

const std::vector<std::string> &Exchange::Answers() const {
  return parts_->responseState.answers;
}

} // namespace scripted

// The utility library.

int QARDCFileExist(const char *path) {
  Record(std::string("QARDCFileExist(") + path + ")");
  const auto &files = Get().existingFiles;
  return std::find(files.begin(), files.end(), path) == files.end() ? 0 : 1;
}

int QARDCFileCheckKeyValue(const char *path, const char *key, const char *value, int flags) {
  Record(std::string("QARDCFileCheckKeyValue(") + path + ", " + key + ", " + value + ", " + std::to_string(flags) +
         ")");
  return Get().checkKeyValueResult;
}

// The wireless libraries.

namespace vornwireless::wifi::utils {

int GetTopologyString(std::string &topology) {
  Record("GetTopologyString()");
  if (Get().topologyResult >= 0) {
    topology = Get().topology;
  }
  return Get().topologyResult;
}

int GetSupportedMode(std::string &mode) {
  Record("GetSupportedMode()");
  if (Get().supportedModeResult >= 0) {
    mode = Get().supportedMode;
  }
  return Get().supportedModeResult;
}

bool IsSupportTopology() {
  Record("IsSupportTopology()");
  return Get().supportsTopology;
}

bool HasWifiDongle() {
  Record("HasWifiDongle()");
  return Get().hasDongle;
}

} // namespace vornwireless::wifi::utils

namespace vornwireless::dbus {

WifiClient::WifiClient() {
  Record("WifiClient()");
}

WifiClient::~WifiClient() {
  Record("~WifiClient()");
}

bool WifiClient::IsServerReady() {
  Record("IsServerReady()");
  return Get().serverReady;
}

int WifiClient::SwitchTopology(const std::string &target) {
  Record("SwitchTopology(" + target + ")");
  return Get().switchResult;
}

} // namespace vornwireless::dbus

// An address keeps its text; what is one and what is not is the platform's to say.
namespace vornwireless::utils {

IPAddress::IPAddress() = default;

IPAddress &IPAddress::operator=(const std::string &text) {
  text_ = text;
  return *this;
}

const std::string &IPAddress::GetText() const {
  return text_;
}

} // namespace vornwireless::utils

// The network daemon.

namespace vornnetwork::dbus {

NetClient::NetClient() {
  Record("NetClient()");
}

NetClient::~NetClient() {
  Record("~NetClient()");
}

int NetClient::GetGatewayListData(const Json::Value &request, Json::Value &list) {
  Record("GetGatewayListData(" + Text(request) + ", " + Text(list) + ")");
  list = Get().gateways;
  return Get().gatewayListResult;
}

int NetClient::AddGatewayData(const Json::Value &record) {
  Record("AddGatewayData(" + Text(record) + ")");
  auto &results = Get().addGatewayResults;
  if (results.empty()) {
    return 0;
  }
  const int result = results.front();
  results.erase(results.begin());
  return result;
}

int NetClient::RefreshGateway(const Json::Value &request) {
  Record("RefreshGateway(" + Text(request) + ")");
  return Get().refreshResult;
}

} // namespace vornnetwork::dbus

namespace vornnetwork::network {

// NOLINTNEXTLINE(performance-unnecessary-value-param): the contract's own signature
int FilterList(std::string filter, Json::Value &list) {
  Record("FilterList(" + filter + ", " + Text(list) + ")");
  list = Get().filteredGateways;
  return Get().filterListResult;
}

StaticRoute::StaticRoute() {
  Record("StaticRoute()");
}

StaticRoute::~StaticRoute() {
  Record("~StaticRoute()");
}

int StaticRoute::GetRules(IP_TYPE type, Json::Value &list) {
  Record("GetRules(" + std::to_string(type) + ", " + Text(list) + ")");
  list = Get().routeData;
  return Get().routeResult;
}

int StaticRoute::SetRules(IP_TYPE type, const Json::Value &list) {
  Record("SetRules(" + std::to_string(type) + ", " + Text(list) + ")");
  return Get().routeResult;
}

int StaticRoute::TestRuleVaild(const StaticRouteRule &rule, Json::Value &result) {
  Record("TestRuleVaild({" + std::to_string(rule.ipType) + ", " + rule.destination.GetText() + ", " +
         rule.netmask.GetText() + ", " + rule.gateway.GetText() + ", " + rule.prefixLength + ", " + rule.ifname + ", " +
         (rule.enabled ? "true" : "false") + "}, " + Text(result) + ")");
  result = Get().routeData;
  return Get().routeResult;
}

int StaticRoute::GetRouteTables(IP_TYPE type, Json::Value &list) {
  Record("GetRouteTables(" + std::to_string(type) + ", " + Text(list) + ")");
  list = Get().routeData;
  return Get().routeResult;
}

} // namespace vornnetwork::network

// The network library.

namespace vorn::network {

void NetworkHandler::SetAPIRequest(VORN::APIRequest *request) {
  Record(request == nullptr ? "SetAPIRequest(null)" : "SetAPIRequest(request)");
}

EthernetInterface::EthernetInterface(const std::string &name) : name_(name) {
  Record("EthernetInterface(" + name + ")");
}

EthernetInterface::~EthernetInterface() {
  Record("~EthernetInterface(" + name_ + ")");
}

int EthernetInterface::LoadData() {
  Record("EthernetInterface::LoadData(" + name_ + ")");
  return Get().loadDataResult;
}

int EthernetInterface::GetRedirectNetInfo(Json::Value &result) {
  Record("GetRedirectNetInfo(" + name_ + ")");
  result = Get().redirect;
  return 0;
}

BridgeInterface::BridgeInterface(const std::string &name) : EthernetInterface(name) {
  Record("BridgeInterface(" + name + ")");
}

BridgeInterface::~BridgeInterface() {
  Record("~BridgeInterface(" + GetName() + ")");
}

int BridgeInterface::LoadData() {
  Record("BridgeInterface::LoadData(" + GetName() + ")");
  return Get().loadDataResult;
}

} // namespace vorn::network

int VORNPackageServer::PMSGetRecommendPkgList(const char *language, const char *page, Json::Value &result) {
  Record(std::string("PMSGetRecommendPkgList(") + language + ", " + page + ", " + Text(result) + ")");
  if (Get().packageResult != 0) {
    result = Get().packages;
  }
  return Get().packageResult;
}

// The system log, in place of the C library's.

namespace {

void RecordLog(int priority, const char *format, va_list arguments) {
  char text[4096];
  std::vsnprintf(text, sizeof(text), format, arguments);
  // "unit:line message": the line changes with every edit above it, so that it is left out once it is seen to be one.
  const std::string whole = text;
  const size_t colon = whole.find(':');
  const size_t blank = whole.find(' ');
  const bool wellFormed =
      priority == LOG_ERR && std::string(format).rfind("%s:%d ", 0) == 0 && colon < blank &&
      std::all_of(whole.begin() + static_cast<ptrdiff_t>(colon) + 1, whole.begin() + static_cast<ptrdiff_t>(blank),
                  [](char c) { return c >= '0' && c <= '9'; });
  Get().log.push_back(wellFormed ? whole.substr(0, colon) + ":" + whole.substr(blank) : "malformed: " + whole);
}

} // namespace

extern "C" __attribute__((visibility("default"))) void syslog(int priority, const char *format, ...) {
  va_list arguments;
  va_start(arguments, format);
  RecordLog(priority, format, arguments);
  va_end(arguments);
}

extern "C" __attribute__((visibility("default"))) void __syslog_chk(int priority, int, const char *format, ...) {
  va_list arguments;
  va_start(arguments, format);
  RecordLog(priority, format, arguments);
  va_end(arguments);
}
