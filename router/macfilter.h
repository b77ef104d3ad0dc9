// The wireless MAC filter. It is part of each wireless adapter's configuration: reading shows the first adapter's,
// writing gives all of them the same one. What a policy or an address means is the wireless daemon's to know.
#ifndef ROUTER_MACFILTER_H
#define ROUTER_MACFILTER_H

#include "router/export.h"

#include <json/value.h>

class ROUTER_EXPORT MacFilterHandler {
public:
  MacFilterHandler();
  ~MacFilterHandler();

  /// @param[in,out] out  object or null: gets "mac_filter_policy" and, at the end of "mac_filter_list" (an array, made
  ///                     when there is none), objects "mac", "desc" and "mac_filter_enabled"; on failure nothing but
  ///                     the list where there is none
  bool GetRules(Json::Value &out);

  /// @param[out] config  the first adapter's whole configuration
  bool GetAdapterConfig(Json::Value &config);

  /// Writes the filter to every adapter.
  /// @param[in] data  object: as GetRules gives it; a missing policy is null, a missing list is empty
  /// @return false when an adapter could not be written; those before it are
  bool SetRules(Json::Value &data);

  /// The same. An adapter whose configuration cannot be read is passed over.
  bool SetAdapterConfig(const Json::Value &data);
};

#endif
