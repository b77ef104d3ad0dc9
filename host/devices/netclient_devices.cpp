// The device list of the contract.
#include "host/export.h"

namespace vornnetwork::dbus {
class VORN_EXPORT NetClient;
}

#include "platform/netclient.h"

#include "host/devices/device_list.h"
#include "host/devices/device_store.h"
#include "host/devices/device_text.h"
#include "host/devices/mac_address.h"
#include "host/routes/answer.h"

#include <ctime>

namespace vornnetwork::dbus {

namespace {

using vornhost::LogError;
using vornhost::LogText;

bool IsText(const Json::Value &record, const char *key) {
  return record.isObject() && record[key].isString() && vornhost::IsCleanText(record[key].asString());
}

} // namespace

int NetClient::GetDeviceListData(const std::string &scannerType, Json::Value &result) {
  return vornhost::AnswerFor("devices cannot be listed", [&] {
    const unsigned sources = vornhost::SourcesOf(scannerType);
    if (sources == 0) {
      LogError("no such scanner type: \"%s\"", LogText(scannerType).c_str());
      return false;
    }
    Json::Value list(*vornhost::CurrentList(sources));
    if (!result.isObject()) {
      result = Json::Value(Json::objectValue);
    }
    result["ClientList"].swap(list);
    return true;
  });
}

int NetClient::SetDeviceListData(const Json::Value &record) {
  return vornhost::AnswerFor("a device cannot be edited", [&record] {
    if (!IsText(record, "macAddr") || !IsText(record, "userdef_displayName") || !IsText(record, "userdef_deviceType")) {
      LogError("edit of a device refused: a text is missing or cannot be kept");
      return false;
    }
    const std::optional<std::string> mac = vornhost::ParseDeviceMac(record["macAddr"].asString());
    if (!mac) {
      LogError("edit of a device refused: \"%s\" is no MAC address", LogText(record["macAddr"].asString()).c_str());
      return false;
    }
    const bool kept = vornhost::DeviceStore().SetOwner(
        *mac, {record["userdef_displayName"].asString(), record["userdef_deviceType"].asString()});
    if (!kept) {
      LogError("edit of a device refused: there are %zu already", vornhost::kDeviceLimit);
    }
    return kept;
  });
}

int NetClient::DelDeviceListData(const std::string &mac) {
  return vornhost::AnswerFor("a device cannot be forgotten", [&mac] {
    const std::optional<std::string> known = vornhost::ParseDeviceMac(mac);
    return known && vornhost::DeviceStore().Forget(*known);
  });
}

} // namespace vornnetwork::dbus
