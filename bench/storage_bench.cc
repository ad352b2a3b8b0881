// Statistics buffers: parsing with release, beside a plain list of the same values, and the NAND info of a
// parsed one; telemetry lists to records.

#include <benchmark/benchmark.h>

#include <vector>

#include "platform/platform.h"
#include "storage/nand_info.h"
#include "storage/stats_context.h"
#include "storage/stats_table.h"
#include "storage/storage_test_support.h"
#include "storage/structured_logs.h"
#include "testing/fake_platform.h"

namespace tbdaily {
namespace {

// Every statistic in full, as often as it takes to reach the size.
std::vector<std::byte> buffer(std::size_t size) {
  testing::StatsBuffer once;
  for (const StatDefinition& stat : kStats)
    once.record(stat.id, std::vector<std::uint64_t>(stat.limit, 0x20002 + stat.id));
  std::vector<std::byte> bytes = once.bytes;
  while (bytes.size() < size) bytes.insert(bytes.end(), once.bytes.begin(), once.bytes.end());
  return bytes;
}

// What was put in, read back: how many values there are and their sum.
struct Listed {
  explicit Listed(const StatsContext& context) {
    for (const StatNode& node : context.nodes) {
      ++count;
      sum += node.value;
    }
  }
  bool operator==(const Listed&) const = default;
  std::size_t count = 0;
  std::uint64_t sum = 0;
};

bool listsEverything(const StatsContext& context, std::size_t bufferSize) {
  std::size_t words = 0, values = 0;
  std::uint64_t sum = 0;
  for (const StatDefinition& stat : kStats) {
    words += 1 + std::size_t{stat.limit};
    values += stat.limit;
    sum += (0x20002 + stat.id) * std::uint64_t{stat.limit};
  }
  const std::size_t times = bufferSize / (words * sizeof(std::uint64_t));
  const Listed listed(context);
  return context.nodes.size() == values * times && listed.count == values * times &&
         listed.sum == sum * times;
}

template <typename Use>
void measureParsing(benchmark::State& state, const Use& use) {
  const std::vector<std::byte> bytes = buffer(static_cast<std::size_t>(state.range(0)));
  StatsContext checked;
  if (!STXParseBufferToCxt(checked, bytes) || !listsEverything(checked, bytes.size()))
    return state.SkipWithError("not the values that were put in");
  for (auto _ : state) {
    StatsContext context;
    benchmark::DoNotOptimize(STXParseBufferToCxt(context, bytes));
    use(context);
    STXReleaseContext(context);
  }
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(bytes.size()));
}

void atEverySize(benchmark::internal::Benchmark* measured) {
  // One of each statistic, then the same over and over.
  measured->Arg(1)->Arg(1 << 20)->Arg(64 << 20)->Unit(benchmark::kMicrosecond);
}

void parseAndRelease(benchmark::State& state) {
  measureParsing(state, [](const StatsContext& context) { benchmark::DoNotOptimize(context.nodes.size()); });
}
BENCHMARK(parseAndRelease)->Apply(atEverySize);

// Nodes are made when they are reached; here all of them are.
void parseReadAndRelease(benchmark::State& state) {
  measureParsing(state, [](const StatsContext& context) { benchmark::DoNotOptimize(Listed(context)); });
}
BENCHMARK(parseReadAndRelease)->Apply(atEverySize);

// The same nodes in a list of their own, as one would keep them; nothing is decoded.
void sameNodesAllocatedAndFreed(benchmark::State& state) {
  const std::vector<std::byte> bytes = buffer(static_cast<std::size_t>(state.range(0))), once = buffer(1);
  StatsContext all, context;
  STXParseBufferToCxt(all, bytes);
  STXParseBufferToCxt(context, once);
  std::vector<StatNode> repeated;
  for (const StatNode& node : context.nodes) repeated.push_back(node);
  for (auto _ : state) {
    std::vector<StatNode> nodes;
    while (nodes.size() < all.nodes.size())
      for (const StatNode& node : repeated) nodes.push_back(node);
    if (nodes.size() != all.nodes.size()) state.SkipWithError("not as many nodes");
    benchmark::DoNotOptimize(nodes.data());
    benchmark::ClobberMemory();
  }
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(bytes.size()));
}
BENCHMARK(sameNodesAllocatedAndFreed)->Apply(atEverySize);

void nandInfo(benchmark::State& state) {
  testing::FakePlatform fake;
  const std::vector<std::byte> bytes = buffer(1);
  StatsContext context;
  STXParseBufferToCxt(context, bytes);
  for (auto _ : state)
    benchmark::DoNotOptimize(NandInfoFromContext(fake.preferences, context, false, fake.diagnostics));
  state.SetItemsProcessed(state.iterations() * static_cast<std::int64_t>(context.nodes.size()));
}
BENCHMARK(nandInfo)->Unit(benchmark::kMicrosecond);

// A list of channels to records; the log that takes them keeps nothing.
void telemetryList(benchmark::State& state) {
  struct Sink : testing::FakeLogSubmission {
    void logStructuredData(int, const PlistDictionary&) override {}
  };
  testing::FakePlatform fake;
  Sink sink;
  Platform platform = platformWith(fake.platform, sink);
  const std::int64_t channels = state.range(0);
  const std::vector<std::byte> bytes(static_cast<std::size_t>(channels) * 4128, std::byte{1});
  const PlistValue characteristics =
      PlistValue::dictionary({{"chip-id", PlistValue::string("Q8A")},
                              {"manufacturer-id", PlistValue::string("4582603A5700")},
                              {"num-bus", PlistValue::int64(channels)}});
  for (auto _ : state) {
    const FetchedList list{bytes, bytes.size(), characteristics, "VelmoraEmbeddedNVMeController"};
    benchmark::DoNotOptimize(HandleTelemetryList(platform, list));
  }
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(bytes.size()));
}
BENCHMARK(telemetryList)->Arg(2)->Arg(256)->Unit(benchmark::kMicrosecond);

}  // namespace
}  // namespace tbdaily
