// The scripted platform's device list and poll tasks.
#include "platform/netclient.h"
#include "tests/router/scripted_platform.h"

using scripted::Call;
using scripted::Get;
using scripted::Text;

namespace vornnetwork::dbus {

int NetClient::GetDeviceListData(const std::string &scannerType, Json::Value &result) {
  const int failed = Call("GetDeviceListData(" + scannerType + ", " + Text(result) + ")");
  if (failed == 0) {
    result = Get().deviceList;
  }
  return failed;
}

int NetClient::SetDeviceListData(const Json::Value &record) {
  return Call("SetDeviceListData(" + Text(record) + ")");
}

int NetClient::DelDeviceListData(const std::string &mac) {
  return Call("DelDeviceListData(" + mac + ")");
}

} // namespace vornnetwork::dbus

namespace VORN {

void APIPolling::Start(APIResponse *response, void (*task)(APIRequest *, APIResponse *, void *), void *context) {
  Call("Start(" + std::string(request_ == nullptr ? "null" : "request") + ", " + group_ + ", " + prefix_ + ", " +
       (remove_ ? "remove" : "keep") + ")");
  Get().startedTask = task;
  Get().startedContext = context;
  response->SetSuccess(Get().startReply);
}

bool APIPolling::List(const std::string &prefix, const Json::Value &groups, Json::Value &out) {
  Call("List(" + std::string(request_ == nullptr ? "null" : "request") + ", " + prefix + ", " + Text(groups) + ")");
  error_ = Get().pollError;
  if (error_ == 0) {
    out = Get().tasks;
  }
  return error_ == 0;
}

bool APIPolling::Status(const std::string &id, Json::Value &data) {
  Call("Status(" + std::string(request_ == nullptr ? "null" : "request") + ", " + id + ")");
  error_ = Get().pollError;
  if (error_ == 0) {
    data = Get().taskStatus;
  }
  return error_ == 0;
}

bool APIPolling::Stop(const std::string &id, bool force) {
  return Call("Stop(" + id + ", " + (force ? "force" : "wait") + ")", 1) != 0;
}

} // namespace VORN
