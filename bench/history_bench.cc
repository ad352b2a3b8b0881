// The analytics history of a large store, in rows and values a second: 200,000 scalar rows, 2,000,000
// distribution values in 20,000 rows.
#include <benchmark/benchmark.h>

#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/linux/store/analytics_store.h"
#include "platform/linux/store/sqlite_analytics_history.h"
#include "testing/temporary_folder.h"

namespace tbdaily {
namespace {

constexpr DayNumber kDay = 20000;
constexpr int kScalarKeys = 100'000;
constexpr int kDistributionKeys = 10'000;
constexpr int kDays = 2;
constexpr int kValuesInRow = 100;

bool fill(AnalyticsStore& store) {
  const std::vector<double> values(kValuesInRow, 12.5);
  if (!store.beginLoad().ok()) return false;
  for (int key = 0; key < kScalarKeys; ++key) {
    const std::string name = "com.example.scalar." + std::to_string(key);
    for (int day = 0; day < kDays; ++day) {
      if (!store.setScalar(name, kDay + day, key).ok()) return false;
    }
  }
  for (int key = 0; key < kDistributionKeys; ++key) {
    const std::string name = "com.example.distribution." + std::to_string(key);
    for (int day = 0; day < kDays; ++day) {
      if (!store.appendDistributionValues(name, kDay + day, 0, values).ok()) return false;
    }
  }
  return store.commitLoad().ok() && store.checkpoint().ok();
}

// Filled once for all benchmarks, and removed at the end.
std::unique_ptr<OpenAnalyticsHistory> openHistory() {
  static const testing::TemporaryFolder folder;
  static const DeviceFiles files(folder.path());
  static const StorePlace place = storePlaceOf(files, "/store");
  static const bool filled = [] {
    AnalyticsStore store(place);
    return fill(store);
  }();
  if (!filled) std::abort();
  return SqliteAnalyticsHistory([] { return std::optional(place); }).open();
}

void enumerateScalars(benchmark::State& state) {
  std::int64_t rows = 0;
  openHistory();
  for (auto _ : state) {
    std::int64_t sum = 0;
    openHistory()->enumerateScalars("", kDay, kDay + 1,
                                    [&](std::string_view, DayNumber, std::int64_t value, bool&) {
                                      sum += value;
                                      ++rows;
                                    });
    benchmark::DoNotOptimize(sum);
  }
  state.SetItemsProcessed(rows);
}
BENCHMARK(enumerateScalars)->Unit(benchmark::kMillisecond);

void enumerateDistributionValues(benchmark::State& state) {
  std::int64_t read = 0;
  openHistory();
  for (auto _ : state) {
    double sum = 0;
    openHistory()->enumerateDistributions(
        "", kDay, kDay + 1, [&](std::string_view, DayNumber, DistributionEnumerator& values, bool&) {
          double value = 0;
          std::int32_t seconds = 0;
          for (; values.nextValue(value, seconds); ++read) sum += value;
        });
    benchmark::DoNotOptimize(sum);
  }
  state.SetItemsProcessed(read);
}
BENCHMARK(enumerateDistributionValues)->Unit(benchmark::kMillisecond);

// Rows whose values nobody asks for.
void dropDistributionRows(benchmark::State& state) {
  std::int64_t rows = 0;
  openHistory();
  for (auto _ : state) {
    openHistory()->enumerateDistributions(
        "", kDay, kDay + 1, [&](std::string_view, DayNumber, DistributionEnumerator&, bool&) { ++rows; });
  }
  state.SetItemsProcessed(rows);
}
BENCHMARK(dropDistributionRows)->Unit(benchmark::kMillisecond);

}  // namespace
}  // namespace tbdaily
