// The search for a thread in a stack snapshot, against reading the same memory. The thread is the last one of
// which the search learns, and must be found.

#include <benchmark/benchmark.h>

#include <cstring>
#include <span>
#include <string>
#include <string_view>

#include "platform/byte_reader.h"
#include "storage/freezer_writes.h"
#include "storage/kcdata_test_support.h"

namespace tbdaily {
namespace {

constexpr std::string_view kThread = "VM_swapout";
constexpr std::uint64_t kWritten = 4711;

// Tasks of eight threads with the items of a real snapshot: frames, I/O statistics, a name.
std::string snapshot(std::size_t size) {
  testing::KcdataBuffer buffer;
  buffer.begin(0);
  std::uint64_t id = 1;
  for (; buffer.bytes.size() < size; ++id) {
    buffer.begin(id << 8).item(0x903, std::string(200, 't'));
    for (std::uint64_t thread = 1; thread <= 8; ++thread) {
      buffer.begin(id << 8 | thread).item(0x905, std::string(112, 's')).ioStats(id);
      buffer.item(0x20, std::string(240, 'f')).name("worker").end(id << 8 | thread);
    }
    buffer.end(id << 8);
  }
  buffer.begin(id << 8).ioStats(kWritten).name(kThread).end(id << 8);
  return buffer.end(0).bufferEnd().bytes;
}

void measureSearch(benchmark::State& state, std::string_view buffer) {
  bool isFound = false;
  KcdataIOStats ioStats;
  for (auto _ : state) {
    isFound = getIOStatsWithThreadnameFromKCData(std::as_bytes(std::span(buffer)), kThread, ioStats);
    benchmark::DoNotOptimize(isFound);
  }
  if (!isFound || !ioStats || ByteReader(*ioStats).at<std::uint64_t>(24) != kWritten)
    state.SkipWithError("the thread was not found");
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(buffer.size()));
}

void walk(benchmark::State& state) {
  measureSearch(state, snapshot(static_cast<std::size_t>(state.range(0))));
}
BENCHMARK(walk)->Arg(1 << 20)->Arg(64 << 20)->Unit(benchmark::kMicrosecond);

// Nothing but containers in containers, none of them closed; the thread is the outermost.
void walkNested(benchmark::State& state) {
  testing::KcdataBuffer buffer;
  buffer.begin(0).ioStats(kWritten).name(kThread);
  for (std::int64_t level = 1; level < state.range(0); ++level)
    buffer.begin(static_cast<std::uint64_t>(level));
  measureSearch(state, buffer.bytes);
}
BENCHMARK(walkNested)->Arg(50'000)->Arg(100'000)->Unit(benchmark::kMicrosecond);

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
