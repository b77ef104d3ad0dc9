#include "host/network/topology_snapshot.h"

#include "host/network/dhcp_client.h"
#include "host/network/interface_name.h"
#include "host/network/names.h"
#include "host/network/topology_config.h"
#include "host/wireless/supplicant.h"

#include <json/reader.h>
#include <json/value.h>
#include <json/writer.h>

#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <fstream>
#include <map>
#include <memory>

namespace vornhost {

namespace {

// Reading and writing share one description of each record, so that no field is kept on one side only. Numbers are
// texts: JSON's are not exact in every reader.
class Writer {
public:
  explicit Writer(Json::Value &object) : object_(object) { object_ = Json::Value(Json::objectValue); }
  void Field(const char *key, const std::string &value) { object_[key] = value; }
  template <typename Number> void Field(const char *key, const Number &value) { object_[key] = std::to_string(value); }

private:
  Json::Value &object_;
};

class Reader {
public:
  explicit Reader(const Json::Value &object) : object_(object) {}
  void Field(const char *key, std::string &value) { value = Text(key); }
  template <typename Number> void Field(const char *key, Number &value) {
    value = static_cast<Number>(std::stoull(Text(key)));
  }

private:
  std::string Text(const char *key) const {
    if (!object_.isObject() || !object_[key].isString()) {
      throw std::runtime_error(key);
    }
    return object_[key].asString();
  }

  const Json::Value &object_;
};

template <typename Direction, typename Record> void Describe(Direction &&direction, Record &address, const Address *) {
  direction.Field("family", address.family);
  direction.Field("address", address.text);
  direction.Field("broadcast", address.broadcast);
  direction.Field("scope", address.scope);
  direction.Field("flags", address.flags);
  direction.Field("valid", address.validSeconds);
  direction.Field("preferred", address.preferredSeconds);
}

template <typename Direction, typename Record> void Describe(Direction &&direction, Record &route, const Route *) {
  direction.Field("family", route.family);
  direction.Field("destination", route.destination);
  direction.Field("gateway", route.gateway);
  direction.Field("source", route.source);
  direction.Field("metric", route.metric);
  direction.Field("table", route.table);
  direction.Field("protocol", route.protocol);
  direction.Field("scope", route.scope);
  direction.Field("hop_flags", route.hopFlags);
}

template <typename Direction, typename Record> void Describe(Direction &&direction, Record &state, const LinkState *) {
  direction.Field("name", state.link.name);
  direction.Field("kind", state.link.kind);
  direction.Field("mac", state.link.mac);
  direction.Field("up", state.link.up);
  direction.Field("master", state.master);
}

template <typename Record> Json::Value ListJson(const std::vector<Record> &records) {
  Json::Value list(Json::arrayValue);
  for (const Record &record : records) {
    Describe(Writer(list.append(Json::Value())), record, &record);
  }
  return list;
}

template <typename Record> std::vector<Record> ReadList(const Json::Value &list) {
  if (!list.isArray()) {
    throw std::runtime_error("list");
  }
  std::vector<Record> out;
  for (const Json::Value &entry : list) {
    Record record;
    Describe(Reader(entry), record, &record);
    out.push_back(std::move(record));
  }
  return out;
}

// "addr_gen_mode" is absent where IPv6 is off.
Json::Value LinkJson(const LinkState &state) {
  Json::Value out;
  Describe(Writer(out), state, &state);
  if (state.link.addrGenMode) {
    out["addr_gen_mode"] = *state.link.addrGenMode;
  }
  out["addresses"] = ListJson(state.addresses);
  out["routes"] = ListJson(state.routes);
  return out;
}

LinkState ReadLink(const Json::Value &object) {
  LinkState out;
  Describe(Reader(object), out, &out);
  if (!IsInterfaceName(out.link.name)) {
    throw std::runtime_error("name");
  }
  if (object.isMember("addr_gen_mode")) {
    out.link.addrGenMode = static_cast<uint8_t>(object["addr_gen_mode"].asUInt());
  }
  out.addresses = ReadList<Address>(object["addresses"]);
  out.routes = ReadList<Route>(object["routes"]);
  return out;
}

Snapshot ReadSnapshot(const Json::Value &object) {
  Snapshot out;
  Reader reader(object);
  reader.Field("from", out.from);
  reader.Field("to", out.to);
  reader.Field("boot", out.boot);
  reader.Field("upstream", out.upstream);
  reader.Field("joined", out.joined);
  for (const Json::Value &link : object["links"]) {
    out.links.push_back(ReadLink(link));
  }
  for (const Json::Value &name : object["dhcp"]) {
    out.dhcpInterfaces.push_back(name.asString());
  }
  if (out.links.empty()) {
    throw std::runtime_error("links");
  }
  if (!object["wan_file"].isNull()) {
    out.wanFile = object["wan_file"].asString();
  }
  return out;
}

bool IsConcerned(const Link &link, const std::string &master, const std::string &upstream) {
  const std::array<std::string, 4> names = {kWanPort, kLanBridge, kOneBridge, upstream};
  const auto has = [&names](const std::string &name) {
    return std::find(names.begin(), names.end(), name) != names.end();
  };
  return has(link.name) || (!master.empty() && has(master));
}

} // namespace

std::string LinkState::FirstIpv4() const {
  const auto isIpv4 = [](const Address &address) { return address.family == AF_INET; };
  const auto found = std::find_if(addresses.begin(), addresses.end(), isIpv4);
  return found != addresses.end() ? found->Host() : "";
}

const LinkState *Snapshot::Find(const std::string &name) const {
  const auto found =
      std::find_if(links.begin(), links.end(), [&name](const LinkState &state) { return state.link.name == name; });
  return found != links.end() ? &*found : nullptr;
}

std::string BootId() {
  std::string id;
  std::getline(std::ifstream("/proc/sys/kernel/random/boot_id"), id);
  return id;
}

Snapshot TakeSnapshot(Netlink &netlink, const std::string &from, const std::string &to, const std::string &upstream) {
  const bool joined = !upstream.empty() && Supplicant().IsRunning();
  Snapshot out{from, to, BootId(), upstream, joined, {}, {}, ReadWanFile()};
  for (const std::string &uplink : {std::string(kWanPort), std::string(kOneBridge), upstream}) {
    if (!uplink.empty() && DhcpClient(uplink).IsRunning()) {
      out.dhcpInterfaces.push_back(uplink);
    }
  }
  const std::vector<Link> links = netlink.Links();
  std::map<int, std::string> names;
  for (const Link &link : links) {
    names[link.index] = link.name;
  }
  const std::vector<Address> addresses = netlink.Addresses();
  const std::vector<Route> routes = netlink.Routes();
  for (const Link &link : links) {
    LinkState state{link, link.master != 0 ? names[link.master] : "", {}, {}};
    if (!IsConcerned(link, state.master, upstream)) {
      continue;
    }
    const auto isOfLink = [&link](const auto &entry) { return entry.index == link.index; };
    std::copy_if(addresses.begin(), addresses.end(), std::back_inserter(state.addresses), isOfLink);
    std::copy_if(routes.begin(), routes.end(), std::back_inserter(state.routes), isOfLink);
    out.links.push_back(std::move(state));
  }
  return out;
}

std::string SnapshotText(const Snapshot &snapshot) {
  Json::Value out(Json::objectValue);
  out["from"] = snapshot.from;
  out["to"] = snapshot.to;
  out["boot"] = snapshot.boot;
  out["upstream"] = snapshot.upstream;
  out["joined"] = std::to_string(static_cast<int>(snapshot.joined));
  out["links"] = Json::Value(Json::arrayValue);
  for (const LinkState &state : snapshot.links) {
    out["links"].append(LinkJson(state));
  }
  out["dhcp"] = Json::Value(Json::arrayValue);
  for (const std::string &name : snapshot.dhcpInterfaces) {
    out["dhcp"].append(name);
  }
  out["wan_file"] = snapshot.wanFile ? Json::Value(*snapshot.wanFile) : Json::Value();
  Json::StreamWriterBuilder builder;
  builder["emitUTF8"] = true; // texts of files as they are: the default reads and changes what is no UTF-8
  return Json::writeString(builder, out);
}

std::optional<Snapshot> ParseSnapshot(const std::string &text) {
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  builder.settings_["stackLimit"] = 16;
  const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
  Json::Value object;
  try {
    if (reader->parse(text.data(), text.data() + text.size(), &object, nullptr) && object.isObject()) {
      return ReadSnapshot(object);
    }
  } catch (const std::exception &) { // a member that is missing or of another type: not one of ours
    return std::nullopt;
  }
  return std::nullopt;
}

} // namespace vornhost
