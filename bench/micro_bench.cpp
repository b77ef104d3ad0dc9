// What single pieces cost, beside the plain way of doing the same.
#include "webapi/json_writer.h"

#include <benchmark/benchmark.h>
#include <json/value.h>
#include <json/writer.h>

#include <string>

namespace {

// The list that an owner opens first, with the keys of a client device.
Json::Value Devices(int64_t count) {
  Json::Value result;
  result["stations"] = Json::Value(Json::arrayValue);
  for (int64_t i = 0; i < count; ++i) {
    Json::Value station;
    station["mac"] = "d4:3d:7e:11:22:33";
    station["asso_time"] = "12:30:45 2026/05/01";
    station["ip"] = "192.168.1." + std::to_string(i % 256);
    station["hostname"] = "Living-Room-" + std::to_string(i);
    station["status"] = i % 3 != 0;
    station["type"] = "computer";
    station["brand"] = "Maker, Inc.";
    station["model"] = "";
    station["connection"] = "ethernet";
    station["netif"] = "lbr0";
    result["stations"].append(std::move(station));
  }
  return result;
}

void WriteOwn(benchmark::State &state) {
  const Json::Value value = Devices(state.range(0));
  while (state.KeepRunning()) {
    std::string text;
    vornwebapi::WriteJson(value, text);
    benchmark::DoNotOptimize(text);
  }
}

void WriteJsonCpp(benchmark::State &state) {
  const Json::Value value = Devices(state.range(0));
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  while (state.KeepRunning()) {
    std::string text = Json::writeString(builder, value);
    benchmark::DoNotOptimize(text);
  }
}

BENCHMARK(WriteOwn)->Arg(1)->Arg(50)->Arg(250);
BENCHMARK(WriteJsonCpp)->Arg(1)->Arg(50)->Arg(250);

} // namespace

BENCHMARK_MAIN();
