// The keys of a station record, the object that describes one client device in every answer of the connection list.
// They are constants of the module, so that neither setting nor copying one makes a copy of its text.
#ifndef ROUTER_STATION_H
#define ROUTER_STATION_H

#include <json/value.h>

namespace router::station {

inline const Json::StaticString kStations("stations"); ///< of the listing: the array of records

inline const Json::StaticString kMac("mac");
inline const Json::StaticString kAssoTime("asso_time");
inline const Json::StaticString kIp("ip");
inline const Json::StaticString kHostname("hostname");
inline const Json::StaticString kStatus("status");
inline const Json::StaticString kType("type");
inline const Json::StaticString kBrand("brand");
inline const Json::StaticString kModel("model");
inline const Json::StaticString kConnection("connection");
inline const Json::StaticString kNetif("netif");
inline const Json::StaticString kTransferRx("transferRX");
inline const Json::StaticString kTransferTx("transferTX");
inline const Json::StaticString kSignalStrength("signalstrength");

// Texts that records hold.
inline const Json::StaticString kNone("");
inline const Json::StaticString kEthernet("ethernet");
inline const Json::StaticString kWifi("wifi");
inline const Json::StaticString kOthers("others");

} // namespace router::station

#endif
