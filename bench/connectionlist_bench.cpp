// What listing client devices costs a device: the neighbour table read and merged, and the device store's list mapped.
// The platform under the module answers at once, so that the figures are the module's own. Puts a neighbour table in
// place: run it as  private_view -- connectionlist_bench
#include "platform/netclient.h"
#include "platform/netif.h"
#include "platform/utility.h"
#include "platform/wifi.h"
#include "router/clhandler.h"
#include "router/connectionlist.h"

#include <benchmark/benchmark.h>

#include <sys/mount.h>
#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <fstream>
#include <string>
#include <vector>

namespace {

constexpr char kNetFolder[] = "/tmp/proc-net";
constexpr std::array<int64_t, 3> kTableSizes = {250, 4096, 65536};

Json::Value deviceList;

std::string MacAddress(int64_t number) {
  char text[24];
  std::snprintf(text, sizeof(text), "02:00:%02x:%02x:%02x:%02x", static_cast<unsigned>(number >> 24 & 0xff),
                static_cast<unsigned>(number >> 16 & 0xff), static_cast<unsigned>(number >> 8 & 0xff),
                static_cast<unsigned>(number & 0xff));
  return text;
}

std::string Address(int64_t number) {
  return "10." + std::to_string(number >> 16 & 0xff) + "." + std::to_string(number >> 8 & 0xff) + "." +
         std::to_string(number & 0xff);
}

void PutNeighbours(int64_t count) {
  std::ofstream table(std::string(kNetFolder) + "/arp");
  table << "IP address       HW type     Flags       HW address            Mask     Device\n";
  for (int64_t i = 0; i < count; ++i) {
    table << Address(i) << "      0x1         0x2         " << MacAddress(i) << "     *        lbr0\n";
  }
}

// Every second neighbour is a wireless station too.
Json::Value Stations(int64_t count) {
  Json::Value stations(Json::arrayValue);
  for (int64_t i = 0; i < count; i += 2) {
    Json::Value station;
    station["mac"] = MacAddress(i);
    stations.append(std::move(station));
  }
  return stations;
}

void CountPerDevice(benchmark::State &state) {
  using benchmark::Counter;
  state.counters["per_device"] =
      Counter(static_cast<double>(state.range(0)), Counter::kIsIterationInvariantRate | Counter::kInvert);
}

bool ReadAndMergeOnce(ConnectionList &list, Json::Value &stations, int64_t count) {
  Json::Value wired(Json::arrayValue);
  return list.LoadArpConnData(wired) && list.CombineJsonData(stations, wired) &&
         stations.size() == static_cast<unsigned>(count);
}

void ReadAndMerge(benchmark::State &state) {
  PutNeighbours(state.range(0));
  const Json::Value known = Stations(state.range(0));
  ConnectionList list;
  while (state.KeepRunning()) {
    state.PauseTiming();
    {
      Json::Value stations = known;
      state.ResumeTiming();
      if (!ReadAndMergeOnce(list, stations, state.range(0))) {
        state.SkipWithError("the merged list is not what it should be");
      }
      state.PauseTiming();
    }
    state.ResumeTiming();
  }
  CountPerDevice(state);
}

double ProcessorSeconds() {
  timespec time{};
  clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &time);
  return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) / 1e9;
}

// The least that a row took of the processor, of several runs of as many rows each: what disturbs a run only adds to
// it.
double LeastNanosecondsARow(int64_t count) {
  constexpr int kRuns = 9;
  constexpr int64_t kRowsARun = 65536;
  PutNeighbours(count);
  const Json::Value known = Stations(count);
  ConnectionList list;
  double least = HUGE_VAL;
  for (int run = 0; run < kRuns; ++run) {
    double used = 0;
    int64_t rows = 0;
    for (; rows < kRowsARun; rows += count) {
      Json::Value stations = known;
      const double begin = ProcessorSeconds();
      if (!ReadAndMergeOnce(list, stations, count)) {
        return HUGE_VAL;
      }
      used += ProcessorSeconds() - begin;
    }
    least = std::min(least, used * 1e9 / static_cast<double>(rows));
  }
  return least;
}

// A row may take as much again by half in the largest table as in the smallest.
bool TimePerRowIsEven() {
  constexpr double kLimit = 1.5;
  std::printf("\nneighbour table read and merged, least of several runs\n");
  std::vector<double> figures;
  for (const int64_t count : kTableSizes) {
    figures.push_back(LeastNanosecondsARow(count));
    std::printf("%8d rows  %6.0f ns a row\n", static_cast<int>(count), figures.back());
  }
  const auto [least, most] = std::minmax_element(figures.begin(), figures.end());
  const bool kept = *most <= kLimit * *least;
  std::printf("most to least %.2f   at most %g   %s\n", *most / *least, kLimit, kept ? "kept" : "MISSED");
  return kept;
}

Json::Value Entry(int64_t number) {
  const std::time_t now = std::time(nullptr);
  std::tm fields{};
  localtime_r(&now, &fields);
  char time[32];
  std::strftime(time, sizeof(time), "%T %Y/%m/%d", &fields);
  Json::Value entry;
  entry["macAddr"] = MacAddress(number);
  entry["asso_time"] = time;
  entry["ipAddr"] = Address(number);
  entry["displayName"] = "Living-Room-" + std::to_string(number);
  entry["deviceType"] = "computer";
  entry["manufacturer"] = "Maker, Inc.";
  entry["netif"] = "lbr0";
  return entry;
}

// The daemon's answer is made before each round: what it costs is the daemon's.
void MapDevices(benchmark::State &state) {
  Json::Value entries(Json::arrayValue);
  for (int64_t i = 0; i < state.range(0); ++i) {
    entries.append(Entry(i));
  }
  while (state.KeepRunning()) {
    state.PauseTiming();
    {
      deviceList["ClientList"] = entries;
      Json::Value result;
      ConnectionListHandler handler;
      state.ResumeTiming();
      if (handler.GetList("all", "all", result) != 0) {
        state.SkipWithError("no list");
      }
      benchmark::DoNotOptimize(result);
      state.PauseTiming();
    }
    state.ResumeTiming();
  }
  CountPerDevice(state);
}

BENCHMARK(ReadAndMerge)->Arg(kTableSizes[0])->Arg(kTableSizes[1])->Arg(kTableSizes[2])->Unit(benchmark::kMicrosecond);
BENCHMARK(MapDevices)->Arg(50)->Arg(250)->Arg(2000)->Unit(benchmark::kMicrosecond);

} // namespace

int QARDNetInterfaceEnum(QARDNetInterface *entries, int, int) {
  std::strcpy(entries[0].name, "lbr0");
  return 1;
}

int VORNNetIFGetInfo(const char *, int, VORNNetIFInfo *) {
  return 1;
}

int VORNNetIsSameSubnet(const char *, const char *, const char *) {
  return 1;
}

int QARDCExec(const char *, const char *, const char *, const char *, const char *) {
  return 0;
}

namespace vornnetwork::dbus {

NetClient::NetClient() = default;
NetClient::~NetClient() = default;

int NetClient::GetDeviceListData(const std::string &, Json::Value &result) {
  result.swap(deviceList);
  return 0;
}

int NetClient::SetDeviceListData(const Json::Value &) {
  return 0;
}

int NetClient::DelDeviceListData(const std::string &) {
  return 0;
}

} // namespace vornnetwork::dbus

namespace vornwireless::dbus {

WifiClient::WifiClient() = default;
WifiClient::~WifiClient() = default;

bool WifiClient::IsServerReady() {
  return false;
}

int WifiClient::GetAdapterList(Json::Value &) {
  return -1;
}

int WifiClient::GetAdapterConfig(const std::string &, Json::Value &) {
  return -1;
}

int WifiClient::GetConnectionList(const std::string &, Json::Value &) {
  return -1;
}

} // namespace vornwireless::dbus

int vornwireless::wifi::utils::GetTopologyString(std::string &) {
  return -1;
}

int main(int argc, char **argv) {
  if (std::getenv("VORN_PRIVATE_VIEW") == nullptr) {
    std::fputs("Run it as: private_view -- connectionlist_bench\n", stderr);
    return 2;
  }
  mkdir(kNetFolder, 0755);
  if (mount(kNetFolder, "/proc/self/net", nullptr, MS_BIND, nullptr) != 0) {
    std::perror("/proc/self/net");
    return 1;
  }
  benchmark::Initialize(&argc, argv);
  benchmark::RunSpecifiedBenchmarks();
  return TimePerRowIsEven() ? 0 : 1;
}
