// What a set of port forwards costs below the module: the rule file written and read, and the kernel's table replaced.
// Writes to /etc and to the kernel: run it in a view of its own, as root: private_view -- dnat_bench
#include "host/portforward/dnat.h"
#include "host/portforward/record_text.h"

#include <benchmark/benchmark.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <sys/stat.h>

namespace {

constexpr char kRuleFile[] = "/etc/portforward/routerpf/rule.conf";

vornhost::RecordList Rules(int64_t count, int64_t round) {
  vornhost::RecordList head;
  std::string content;
  for (int64_t i = 0; i < count; ++i) {
    content += "[" + std::to_string(i) + "]\nenabled=\"1\"\ns_port=\"" + std::to_string(80 + round % 2) +
               "\"\ns_ip=\"192.168.1.110\"\nr_port=\"" + std::to_string(10000 + i) +
               "\"\nprotocol name=\"tcp\"\nservice=\"rule " + std::to_string(i) + "\"\n";
  }
  vornhost::ParseRecords(content, head);
  return head;
}

// Every round stores something else.
void WriteRuleFile(benchmark::State &state) {
  int64_t round = 0;
  for ([[maybe_unused]] auto once : state) {
    state.PauseTiming();
    const auto rules = Rules(state.range(0), ++round);
    state.ResumeTiming();
    if (VORNPFConfSet(rules.get(), kRuleFile) != 0) {
      state.SkipWithError("not written");
    }
  }
}

void ReadRuleFile(benchmark::State &state) {
  VORNPFConfSet(Rules(state.range(0), 0).get(), kRuleFile);
  for ([[maybe_unused]] auto once : state) {
    VORNPFRecord *head = nullptr;
    if (VORNPFConfGet(&head, kRuleFile, 0, 0, 0) < 0) {
      state.SkipWithError("not read");
    }
    VORNPFConfFree(head);
  }
}

void StartDnat(benchmark::State &state) {
  VORNPFConfSet(Rules(state.range(0), 0).get(), kRuleFile);
  for ([[maybe_unused]] auto once : state) {
    if (!vornhost::StartDnat()) {
      state.SkipWithError("the kernel refuses");
    }
  }
}

BENCHMARK(WriteRuleFile)->Arg(100)->Arg(1000)->Arg(5000)->Unit(benchmark::kMillisecond)->UseRealTime();
BENCHMARK(ReadRuleFile)->Arg(100)->Arg(1000)->Arg(5000)->Unit(benchmark::kMillisecond)->UseRealTime();
BENCHMARK(StartDnat)->Arg(100)->Arg(1000)->Arg(5000)->Unit(benchmark::kMillisecond)->UseRealTime();

} // namespace

int main(int argc, char **argv) {
  if (std::getenv("VORN_PRIVATE_VIEW") == nullptr) {
    std::fputs("Run it as: private_view -- dnat_bench\n", stderr);
    return 2;
  }
  mkdir("/etc/portforward", 0755);
  mkdir("/etc/portforward/routerpf", 0755);
  if (std::system("ip link add lbr0 type bridge && ip addr add 192.168.1.1/24 dev lbr0 && ip link set lbr0 up") != 0) {
    return 1;
  }
  benchmark::Initialize(&argc, argv);
  benchmark::RunSpecifiedBenchmarks();
  return 0;
}
