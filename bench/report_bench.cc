// Whitelist look-up, scalar rounding, distribution reduction, and a whole run over a store on disk.

#include <benchmark/benchmark.h>

#include <cmath>
#include <filesystem>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "platform/linux/store/analytics_store.h"
#include "platform/linux/store/sqlite_analytics_history.h"
#include "platform/platform.h"
#include "platform/plist/codec.h"
#include "report/distribution_summary.h"
#include "report/internal_device.h"
#include "report/prefix_index.h"
#include "report/scalar_rounding.h"
#include "report/tb_report.h"
#include "testing/fake_platform.h"
#include "testing/temporary_folder.h"

namespace tbdaily {
namespace {

constexpr DayNumber kDay = 20780;

// So many prefixes, and keys of which every second begins with one of them.
struct Prefixes {
  explicit Prefixes(std::int64_t count) {
    for (std::int64_t i = 0; i < count; ++i)
      texts.push_back("com.velmora.domain" + std::to_string(i) + ".metric.");
    for (std::size_t i = 0; i < 64; ++i) {
      const std::string& prefix = texts[i * 7919 % texts.size()];
      keys.push_back(prefix + "value");
      matches.push_back(prefix);
      keys.push_back("com.velmora.other" + std::to_string(i));
      matches.push_back(keys.back());
    }
  }
  std::vector<std::string> texts, keys;
  std::vector<std::string> matches;  // the prefix of each key, or the key itself when it has none
};

struct TextHash {
  using is_transparent = void;
  std::size_t operator()(std::string_view text) const { return std::hash<std::string_view>()(text); }
};
using PlaceOfText = std::unordered_map<std::string, std::uint32_t, TextHash, std::equal_to<>>;

PlaceOfText placesOf(const std::vector<std::string>& texts) {
  PlaceOfText places;
  for (std::uint32_t place = 0; place < texts.size(); ++place) places.emplace(texts[place], place);
  return places;
}

std::optional<std::uint32_t> placeOf(const PlaceOfText& places, std::string_view text) {
  const auto found = places.find(text);
  return found == places.end() ? std::nullopt : std::optional(found->second);
}

// The cost of a look-up must depend on the key, not on how many prefixes there are.
void firstMatchingPrefix(benchmark::State& state) {
  const Prefixes prefixes(state.range(0));
  const std::vector<std::string>& keys = prefixes.keys;
  const PrefixIndex index({prefixes.texts.begin(), prefixes.texts.end()});
  {
    const PlaceOfText places = placesOf(prefixes.texts);
    for (std::size_t i = 0; i < keys.size(); ++i) {
      if (index.firstMatch(keys[i]) != placeOf(places, prefixes.matches[i]))
        return state.SkipWithError("not the prefix that the hash table has");
    }
  }
  std::size_t next = 0;
  for (auto _ : state) benchmark::DoNotOptimize(index.firstMatch(keys[next++ % keys.size()]));
}
BENCHMARK(firstMatchingPrefix)->RangeMultiplier(10)->Range(10, 1000000);

// What one look-up costs whoever knows already which prefix it is.
void hashLookup(benchmark::State& state) {
  const Prefixes prefixes(state.range(0));
  const std::vector<std::string>& matches = prefixes.matches;
  const PlaceOfText places = placesOf(prefixes.texts);
  std::size_t next = 0;
  for (auto _ : state) benchmark::DoNotOptimize(placeOf(places, matches[next++ % matches.size()]));
}
BENCHMARK(hashLookup)->RangeMultiplier(10)->Range(10, 1000000);

void roundScalar(benchmark::State& state) {
  const PlistDictionary options{{"bucket_interval", PlistValue::int64(1024)},
                                {"sig_fig", PlistValue::int64(2)}};
  std::int64_t value = 123456789;
  for (auto _ : state) benchmark::DoNotOptimize(roundedScalar(value++, options));
}
BENCHMARK(roundScalar);

void reduceDistribution(benchmark::State& state) {
  const std::vector<double> boundaries = {5, 10, 25, 50, 100, 250, 1000};
  std::vector<double> values;
  for (int i = 0; i < 100000; ++i) values.push_back(std::fmod(i * 37.7, 1200));
  for (auto _ : state) {
    DistributionSummary summary;
    std::vector<std::uint64_t> counts(boundaries.size() + 1);
    for (const double value : values) {
      summary.add(value);
      ++counts[determineHistBucketForValueWithIntervals(value, boundaries)];
    }
    benchmark::DoNotOptimize(counts.data());
    benchmark::DoNotOptimize(summary.statistics());
  }
  state.SetItemsProcessed(static_cast<std::int64_t>(values.size()) * state.iterations());
}
BENCHMARK(reduceDistribution);

void fillStore(AnalyticsStore& store, std::int64_t scalars, std::int64_t values) {
  store.beginLoad();
  for (std::int64_t i = 0; i < scalars; ++i) store.setScalar("scalar." + std::to_string(i), kDay, i * 7919);
  constexpr std::int64_t kDistributions = 200;
  std::vector<double> row(static_cast<std::size_t>(values / kDistributions));
  for (std::size_t i = 0; i < row.size(); ++i) row[i] = std::fmod(static_cast<double>(i) * 37.7, 1200);
  for (std::int64_t d = 0; d < kDistributions; ++d) {
    store.appendDistributionValues("distribution." + std::to_string(d), kDay, 0, row);
  }
  store.commitLoad();
}

// From the store on disk to the serialized report; the arguments are the numbers of scalars and of
// distribution values.
void writeWholeReport(benchmark::State& state) {
  const testing::TemporaryFolder folder;
  const DeviceFiles files(folder.path());
  const StorePlace place = storePlaceOf(files, "/store");
  {
    AnalyticsStore store(place);
    fillStore(store, state.range(0), state.range(1));
  }
  testing::FakePlatform fake;
  PlistCodec codec;
  SqliteAnalyticsHistory history([&place] { return std::optional(place); });
  const PlistValue scalarOptions = PlistValue::dictionary({{"sig_fig", PlistValue::int64(2)}});
  const PlistValue distributionOptions = PlistValue::dictionary(
      {{"intervals",
        PlistValue::array({PlistValue::int64(10), PlistValue::int64(100), PlistValue::int64(1000)})}});
  const auto group = PlistValue::dictionary(
      {{"ScalarKeyPrefixes", PlistValue::dictionary({{"scalar.", scalarOptions}})},
       {"DistributionKeyPrefixes", PlistValue::dictionary({{"distribution.", distributionOptions}})}});
  const PlistWriteResult whitelist = codec.write(PlistValue::dictionary({{"All", group}}));
  const auto bytes = std::as_bytes(std::span(whitelist.bytes));
  fake.fileSystem.files[std::string(kWhitelistPath)] = {bytes.begin(), bytes.end()};
  Platform platform = platformWith(fake.platform, history, codec);
  for (auto _ : state) {
    fake.logSubmission.logs.clear();
    fake.systemLog.lines.clear();
    TBReport(platform, {[] { return 0; }, [] { return 0; }})
        .writeLogForYesterdayWithAppInfo(kDay, PlistValue());
  }
  if (fake.logSubmission.logs.empty()) state.SkipWithError("no report was written");
  state.SetItemsProcessed((state.range(0) + state.range(1)) * state.iterations());
}
BENCHMARK(writeWholeReport)->Args({20000, 200000})->Args({200000, 2000000})->Unit(benchmark::kMillisecond);

}  // namespace
}  // namespace tbdaily
