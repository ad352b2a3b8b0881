// Statistics buffers: parsing with release, and the NAND info of a parsed one; telemetry lists to records.

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

void parseAndRelease(benchmark::State& state) {
  const std::vector<std::byte> bytes = buffer(static_cast<std::size_t>(state.range(0)));
  for (auto _ : state) {
    StatsContext context;
    benchmark::DoNotOptimize(STXParseBufferToCxt(context, bytes));
    STXReleaseContext(context);
  }
  state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(bytes.size()));
}
// One of each statistic, then the same over and over.
BENCHMARK(parseAndRelease)->Arg(1)->Arg(1 << 20)->Arg(64 << 20)->Unit(benchmark::kMicrosecond);

void nandInfo(benchmark::State& state) {
  testing::FakePlatform fake;
  StatsContext context;
  STXParseBufferToCxt(context, buffer(1));
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
