// Lists of station records and neighbour tables as no network has them, the same ones for the same seed.
#ifndef TESTS_ROUTER_RANDOM_STATIONS_H
#define TESTS_ROUTER_RANDOM_STATIONS_H

#include <json/value.h>

#include <random>
#include <string>
#include <vector>

namespace scripted {

class RandomStations {
public:
  explicit RandomStations(unsigned seed) : engine_(seed) {}

  /// Few different values, so that most stand several times; any member may be missing.
  Json::Value List() {
    Json::Value list(Json::arrayValue);
    for (size_t count = Below(12); count > 0; --count) {
      Json::Value record(Json::objectValue);
      Set(record, "mac", {"aa:bb:cc:dd:ee:01", "aa:bb:cc:dd:ee:02", "AA:BB:CC:DD:EE:01", "Aa:bB:cc:dd:ee:01", "a", ""});
      Set(record, "ip", {"192.168.1.1", "192.168.1.2", "192.168.1.10", "", "?"});
      Set(record, "netif", {"br0", "lbr0", "eth0", "xbry", ""});
      Set(record, "hostname", {"", "?", "tv", "printer", "??"});
      record["place"] = static_cast<unsigned>(places_++);
      list.append(record);
    }
    return list;
  }

  std::string Table() {
    std::string table;
    for (size_t words = Below(80); words > 0; --words) {
      table += Pick({"192.168.1.1", "192.168.1.2", "192.168.1.3", "0x0", "0x2", "aa:bb:cc:dd:ee:01", "*", "br0", "lbr0",
                     "xbr", "eth0"});
      table += Pick({" ", "  ", "\t", " \v ", "\f", " \r", " ", " ", " ", "\n", "\n\n"});
    }
    return table;
  }

private:
  size_t Below(size_t limit) { return std::uniform_int_distribution<size_t>(0, limit - 1)(engine_); }
  std::string Pick(const std::vector<std::string> &texts) { return texts[Below(texts.size())]; }
  void Set(Json::Value &record, const char *key, const std::vector<std::string> &texts) {
    if (Below(6) != 0) {
      record[key] = Pick(texts);
    }
  }

  std::mt19937 engine_;
  size_t places_ = 0;
};

} // namespace scripted

#endif
