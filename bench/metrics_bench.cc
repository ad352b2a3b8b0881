// Driver metrics: the cost of a sampling, for each channel, beside a plain copy of the same bytes; walks;
// comparing two samples.

#include <benchmark/benchmark.h>
#include <malloc.h>

#include <algorithm>
#include <optional>
#include <vector>

#include "drivermetrics/kd_report_test_support.h"

namespace tbdaily {

using namespace kdreport;
namespace {

constexpr std::int64_t kMost = 64'000;
const std::vector<std::int64_t> kCounts = {1'000, 4'000, 16'000, kMost};
constexpr std::int64_t kChannelsOfADriver = 100;
constexpr ChannelType kSimpleType = fakes::channelType(kKdReportSimple);

// Freed memory stays with the process, as it does in one that samples again and again beside other work: what
// the kernel takes for handing out fresh pages is no cost of a channel.
[[maybe_unused]] const bool keepsMemory =
    mallopt(M_MMAP_THRESHOLD, 1 << 30) == 1 && mallopt(M_TRIM_THRESHOLD, 1 << 30) == 1;

std::int64_t driverOf(std::int64_t channel) {
  return 0x100000000 + channel / kChannelsOfADriver;
}

// Discovered as in a daily run: drivers with a legend of one group each.
KdReportCollection channelsOf(std::int64_t count) {
  fakes::FakeDriverRegistry registry;
  for (std::int64_t i = 0; i < count; i += kChannelsOfADriver) {
    PlistArray entries;
    for (std::int64_t k = i; k < std::min(i + kChannelsOfADriver, count); ++k)
      entries.push_back(fakes::legendEntry(k, kSimpleType, "Channel " + std::to_string(k)));
    registry.drivers.push_back(fakes::publishingDriver(
        static_cast<std::uint64_t>(driverOf(i)), "Driver",
        {fakes::legendGroup("Group", {}, KdReportCreateUnitInfo(0), std::move(entries))}));
  }
  return KdReportCopyAllChannels(registry, kKdReportFileByDriver | kKdReportFileByGroup);
}

PlistData bufferOf(std::int64_t count) {
  PlistData bytes;
  bytes.reserve(static_cast<std::size_t>(count) * kElementSize);
  for (std::int64_t i = 0; i < count; ++i)
    fakes::appendElement(bytes, driverOf(i), i, kSimpleType, {.stamp = 1, .words = {i}});
  return bytes;
}

// Whether these are samples of that many channels, each with the value that it should have.
template <typename ValueOf>
bool holds(const KdReportCollection& samples, std::int64_t count, const ValueOf& valueOf) {
  std::int64_t right = 0;
  KdReportIterate(samples.get(), [&](ChannelRecord& channel) -> std::uint32_t {
    const std::int64_t expected = valueOf(KdReportChannelGetChannelID(&channel));
    if (KdReportSimpleGetIntegerValue(&channel) == expected) ++right;
    return kKdReportKeep;
  });
  return right == count && KdReportGetChannelCount(samples.get()) == count;
}

void countChannels(benchmark::State& state) {
  state.counters["per channel"] =
      benchmark::Counter(static_cast<double>(state.range(0)),
                         benchmark::Counter::kIsIterationInvariantRate | benchmark::Counter::kInvert);
}

void BM_PlainCopyOfTheBuffer(benchmark::State& state) {
  const PlistData buffer = bufferOf(state.range(0));
  for (auto _ : state) {
    PlistData copy(buffer);
    benchmark::DoNotOptimize(copy.data());
  }
  countChannels(state);
}
BENCHMARK(BM_PlainCopyOfTheBuffer)->ArgsProduct({kCounts});

void BM_Sampling(benchmark::State& state) {
  const KdReportCollection channels = channelsOf(state.range(0));
  const PlistData buffer = bufferOf(state.range(0));
  if (!holds(KdReportCreateSamplesRaw(channels.get(), buffer), state.range(0), [](auto id) { return id; }))
    state.SkipWithError("the samples do not hold what the buffer holds");
  for (auto _ : state) benchmark::DoNotOptimize(KdReportCreateSamplesRaw(channels.get(), buffer));
  countChannels(state);
}
BENCHMARK(BM_Sampling)->ArgsProduct({kCounts});

void BM_Delta(benchmark::State& state) {
  const KdReportCollection channels = channelsOf(state.range(0));
  const PlistData buffer = bufferOf(state.range(0));
  const KdReportCollection before = KdReportCreateSamplesRaw(channels.get(), buffer);
  const KdReportCollection after = KdReportCreateSamplesRaw(channels.get(), buffer);
  if (!holds(KdReportCreateSamplesDelta(before.get(), after.get()), state.range(0), [](auto) { return 0; }))
    state.SkipWithError("the difference of equal samples is not 0 for each channel");
  for (auto _ : state) benchmark::DoNotOptimize(KdReportCreateSamplesDelta(before.get(), after.get()));
  countChannels(state);
}
BENCHMARK(BM_Delta)->ArgsProduct({kCounts});

// A visit, and a pruning that removes nothing.
template <std::uint32_t (*Walk)(ChannelCollection*, const KdReportVisitor&)>
void BM_Walk(benchmark::State& state) {
  const KdReportCollection channels = channelsOf(state.range(0));
  std::int64_t sum = 0;
  const KdReportVisitor visitor = [&sum](ChannelRecord& channel) -> std::uint32_t {
    sum += KdReportChannelGetChannelID(&channel);
    return kKdReportKeep;
  };
  for (auto _ : state) Walk(channels.get(), visitor);
  benchmark::DoNotOptimize(sum);
  countChannels(state);
}
std::uint32_t visit(ChannelCollection* collection, const KdReportVisitor& visitor) {
  return KdReportIterate(collection, visitor);
}
std::uint32_t prune(ChannelCollection* collection, const KdReportVisitor& visitor) {
  return KdReportPrune(collection, visitor);
}
BENCHMARK(BM_Walk<visit>)->Arg(kMost);
BENCHMARK(BM_Walk<prune>)->Arg(kMost);

}  // namespace
}  // namespace tbdaily
