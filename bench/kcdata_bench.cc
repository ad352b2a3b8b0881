// The search for a thread in a stack snapshot, against reading the same memory.

#include <benchmark/benchmark.h>

#include <cstring>
#include <span>
#include <string>

#include "storage/freezer_writes.h"
#include "storage/kcdata_test_support.h"

namespace tbdaily {
namespace {

// Tasks of eight threads with the items of a real snapshot: frames, I/O statistics, a name.
std::string snapshot(std::size_t size) {
  testing::KcdataBuffer buffer;
  buffer.begin(0);
  for (std::uint64_t id = 1; buffer.bytes.size() < size; ++id) {
    buffer.begin(id << 8).item(0x903, std::string(200, 't'));
    for (std::uint64_t thread = 1; thread <= 8; ++thread) {
      buffer.begin(id << 8 | thread).item(0x905, std::string(112, 's')).ioStats(id);
      buffer.item(0x20, std::string(240, 'f')).name("worker").end(id << 8 | thread);
    }
    buffer.end(id << 8);
  }
  return buffer.end(0).bufferEnd().bytes;
}

void walk(benchmark::State& state) {
  const std::string bytes = snapshot(static_cast<std::size_t>(state.range(0)));
  for (auto _ : state) {
    KcdataIOStats ioStats;
    benchmark::DoNotOptimize(
        getIOStatsWithThreadnameFromKCData(std::as_bytes(std::span(bytes)), "VM_swapout", ioStats));
  }
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(bytes.size()));
}
BENCHMARK(walk)->Arg(1 << 20)->Arg(64 << 20)->Unit(benchmark::kMicrosecond);

// Nothing but containers in containers, none of them closed.
void walkNested(benchmark::State& state) {
  testing::KcdataBuffer buffer;
  for (std::uint64_t id = 0; id < 100'000; ++id) buffer.begin(id);
  for (auto _ : state) {
    KcdataIOStats ioStats;
    benchmark::DoNotOptimize(
        getIOStatsWithThreadnameFromKCData(std::as_bytes(std::span(buffer.bytes)), "VM_swapout", ioStats));
  }
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(buffer.bytes.size()));
}
BENCHMARK(walkNested)->Unit(benchmark::kMicrosecond);

void readMemory(benchmark::State& state) {
  const std::string bytes = snapshot(static_cast<std::size_t>(state.range(0)));
  for (auto _ : state) {
    std::uint64_t sum = 0, word = 0;
    for (std::size_t i = 0; i + sizeof word <= bytes.size(); i += sizeof word) {
      std::memcpy(&word, bytes.data() + i, sizeof word);
      sum += word;
    }
    benchmark::DoNotOptimize(sum);
  }
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(bytes.size()));
}
BENCHMARK(readMemory)->Arg(1 << 20)->Arg(64 << 20)->Unit(benchmark::kMicrosecond);

}  // namespace
}  // namespace tbdaily
