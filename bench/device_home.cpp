// The other half of devices_bench.py.
//
//   device_home fill COUNT    puts so many devices into the device store, most of them seen in the last 20 seconds
//   device_home seen COUNT    says only that they were seen now
//   device_home plain ANSWER  prints the microseconds of processor that it takes to build the list of a listing's
//   answer
//                             (a file) once as a Json::Value, the plain way, and to write it with JsonCpp's own writer
#include "host/devices/device_store.h"
#include "host/devices/presence_file.h"

#include <json/reader.h>
#include <json/writer.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <fstream>
#include <string>
#include <utility>
#include <vector>

namespace {

using vornhost::Device;
using vornhost::Source;

constexpr int kRuns = 15;
constexpr double kRunMicroseconds = 20000;

std::string MacOf(int number) {
  std::array<char, 24> text{};
  std::snprintf(text.data(), text.size(), "3c:2a:f4:%02x:%02x:%02x", number >> 16 & 0xff, number >> 8 & 0xff,
                number & 0xff);
  return text.data();
}

bool IsWireless(int number) {
  return number % 3 == 0;
}

Device DeviceOf(int number) {
  Device device;
  device.mac = MacOf(number);
  device.ip = "192.168." + std::to_string(1 + number / 250) + "." + std::to_string(2 + number % 250);
  device.netif = IsWireless(number) ? "wifi0" : "lbr0";
  device.connection = IsWireless(number) ? "wifi" : "ethernet";
  device.manufacturer = "Brother Industries, LTD.";
  device.sources = vornhost::BitOf(Source::kArp) | vornhost::BitOf(Source::kDhcp) | vornhost::BitOf(Source::kMdns);
  device.lastSeen = std::time(nullptr);
  device.findings[static_cast<size_t>(Source::kDhcp)].name = "host-" + std::to_string(number);
  device.findings[static_cast<size_t>(Source::kMdns)] = {"Living-Room-" + std::to_string(number), "Printer",
                                                         "Brother HL-L2350DW series"};
  return device;
}

bool PutPresence(int count) {
  vornhost::PresenceMap presence;
  for (int number = 0; number < count; ++number) {
    if (number % 5 != 4) { // one in five is out
      vornhost::Presence &entry = presence[MacOf(number)];
      entry.seen = vornhost::BootMillis() - number * 977 % 20000;
      if (IsWireless(number)) {
        entry.radio = {-40 - number % 40, 1000000 + number, 2000000 + number};
      }
    }
  }
  return vornhost::WritePresence(presence);
}

bool Fill(int count) {
  vornhost::DeviceStore store;
  for (const Device &device : store.Devices()) {
    store.Forget(device.mac); // with its owner's name, which would be listed by itself
  }
  std::vector<Device> devices;
  devices.reserve(static_cast<size_t>(count));
  for (int number = 0; number < count; ++number) {
    devices.push_back(DeviceOf(number));
  }
  store.Write(devices, {});
  for (int number = 0; number < count; number += 10) {
    store.SetOwner(MacOf(number), {"Drucker " + std::to_string(number), "printer"});
  }
  return PutPresence(count);
}

double ProcessorMicroseconds() {
  timespec time{};
  clock_gettime(CLOCK_THREAD_CPUTIME_ID, &time);
  return static_cast<double>(time.tv_sec) * 1e6 + static_cast<double>(time.tv_nsec) / 1e3;
}

// What a record says, outside of any Json::Value but for the numbers.
struct Record {
  std::vector<std::pair<std::string, std::string>> texts;
  std::vector<std::pair<std::string, Json::Value>> others;
};

std::vector<Record> ReadRecords(const char *path) {
  Json::Value answer;
  std::ifstream(path) >> answer;
  std::vector<Record> records;
  for (const Json::Value &station : answer["data"]["stations"]) {
    Record &record = records.emplace_back();
    for (const std::string &name : station.getMemberNames()) {
      if (station[name].isString()) {
        record.texts.emplace_back(name, station[name].asString());
      } else {
        record.others.emplace_back(name, station[name]);
      }
    }
  }
  return records;
}

std::string WritePlainly(const std::vector<Record> &records, const Json::StreamWriterBuilder &builder) {
  Json::Value answer;
  answer["success"] = true;
  Json::Value &stations = answer["data"]["stations"] = Json::Value(Json::arrayValue);
  for (const Record &record : records) {
    Json::Value station;
    for (const auto &[name, text] : record.texts) {
      station[name.c_str()] = text;
    }
    for (const auto &[name, value] : record.others) {
      station[name.c_str()] = value;
    }
    stations.append(std::move(station));
  }
  return Json::writeString(builder, answer);
}

bool PrintPlain(const char *path) {
  const std::vector<Record> records = ReadRecords(path);
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  std::vector<double> runs;
  for (int run = 0; run < kRuns; ++run) {
    const double begin = ProcessorMicroseconds();
    int rounds = 0;
    size_t written = 0;
    double used = 0;
    while (used < kRunMicroseconds) {
      written += WritePlainly(records, builder).size();
      ++rounds;
      used = ProcessorMicroseconds() - begin;
    }
    if (written == 0) {
      return false;
    }
    runs.push_back(used / rounds);
  }
  std::nth_element(runs.begin(), runs.begin() + kRuns / 2, runs.end());
  std::printf("%zu %.2f\n", records.size(), runs[kRuns / 2]);
  return true;
}

} // namespace

int main(int argc, char **argv) {
  if (std::getenv("VORN_PRIVATE_VIEW") == nullptr || argc != 3) {
    std::fputs("Run it as: private_view -- device_home fill COUNT | seen COUNT | plain ANSWER\n", stderr);
    return 2;
  }
  if (std::strcmp(argv[1], "plain") == 0) {
    return PrintPlain(argv[2]) ? 0 : 1;
  }
  const auto count = static_cast<int>(std::strtol(argv[2], nullptr, 10));
  return (std::strcmp(argv[1], "fill") == 0 ? Fill(count) : PutPresence(count)) ? 0 : 1;
}
