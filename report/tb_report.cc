#include "report/tb_report.h"

#include <limits>
#include <new>
#include <utility>

#include "platform/system_log.h"
#include "report/distribution_summary.h"
#include "report/scalar_rounding.h"

namespace tbdaily {

namespace {

// The counters of one distribution's histogram; without boundaries, or without memory for the counters, it
// counts nothing.
class Histogram {
 public:
  Histogram(const PlistArray* intervals, std::string_view key, SystemLog& log) : intervals_(intervals) {
    if (intervals == nullptr) return;
    log.message(LogLevel::Debug, "Treating key %@ as a histogram", key);
    try {
      counts_.resize(intervals->size() + 1);
      boundaries_.reserve(intervals->size());
    } catch (const std::bad_alloc&) {
      counts_ = {};
      log.message(LogLevel::Default,
                  "Couldn't allocate histCounts for key %@. Will not calculate histogram values", key);
      return;
    }
    // The whitelist lets only numbers through.
    for (const PlistValue& boundary : *intervals) {
      boundaries_.push_back(boundary.asNumber().value_or(PlistNumber::float64(0)).toDouble());
    }
  }

  bool counts() const { return !counts_.empty(); }
  void add(double value) {
    if (counts()) ++counts_[determineHistBucketForValueWithIntervals(value, boundaries_)];
  }
  PlistValue dictionary() const { return histogramDictForIntervalsWithHistCounts(*intervals_, counts_); }

 private:
  const PlistArray* intervals_;
  std::vector<double> boundaries_;
  std::vector<std::uint64_t> counts_;
};

}  // namespace

TBReport::TBReport(Platform& platform, StoreProbes storeProbes)
    : platform_(platform), storeProbes_(std::move(storeProbes)), _config(TBConfig::init(platform)) {}

void TBReport::writeLogForYesterdayWithAppInfo(DayNumber day, const PlistValue& appInfo) {
  platform_.systemLog.message(LogLevel::Info, "writing tallyd log. yesterday=%d", day);
  readHistory(day);
  serializeWithDateAndAppInfo(day, appInfo);
}

void TBReport::readHistory(DayNumber day) {
  const std::unique_ptr<OpenAnalyticsHistory> history = platform_.analyticsHistory.open();
  const DayNumber previous = day == std::numeric_limits<DayNumber>::min() ? day : day - 1;
  history->enumerateScalars("", previous, day,
                            [this](std::string_view key, DayNumber, std::int64_t value, bool&) {
                              const PlistDictionary* options = scalarOptions(key);
                              if (options != nullptr) addScalarForKeyWithOptions(value, key, *options);
                            });
  history->enumerateDistributions(
      "", previous, day, [this](std::string_view key, DayNumber, DistributionEnumerator& values, bool&) {
        const PlistDictionary* options =
            _config != nullptr ? _config->configOptionsForDistributionKey(key) : nullptr;
        if (options != nullptr) computeAndAddDistributionForKeyWithOptions(values, key, *options);
      });
  if (history->isWhole()) return;
  // As if there were no rows: no report is made from part of them.
  _scalarsOutput = {};
  _distributionsOutput = {};
  _histogramsOutput = {};
}

const PlistDictionary* TBReport::scalarOptions(std::string_view key) const {
  return _config != nullptr ? _config->configOptionsForScalarKey(key) : nullptr;
}

std::int64_t TBReport::addScalarForKeyWithOptions(std::int64_t value, std::string_view key,
                                                  const PlistDictionary& options) {
  const std::int64_t rounded = roundedScalar(value, options);
  _scalarsOutput.set(key, PlistValue::int64(rounded));
  return rounded;
}

void TBReport::addScalarForKeyByExecutingBlock(std::string_view key,
                                               const std::function<std::int64_t()>& producer) {
  const PlistDictionary* options = scalarOptions(key);
  if (options != nullptr) addScalarForKeyWithOptions(producer(), key, *options);
}

void TBReport::computeAndAddDistributionForKeyWithOptions(DistributionEnumerator& values,
                                                          std::string_view key,
                                                          const PlistDictionary& options) {
  const PlistValue intervals = options.get(whitelist_option::kIntervals);
  Histogram histogram(intervals.asArray(), key, platform_.systemLog);
  DistributionSummary summary;
  values.visitValues([&](double value, std::int32_t) {
    summary.add(value);
    histogram.add(value);
  });
  if (histogram.counts()) _histogramsOutput.set(key, histogram.dictionary());
  _distributionsOutput.set(key, summary.statistics());
}

}  // namespace tbdaily
