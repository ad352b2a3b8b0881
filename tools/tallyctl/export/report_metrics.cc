// The metrics of a report.

#include <cmath>

#include "platform/calendar.h"
#include "tools/tallyctl/export/exposition.h"
#include "tools/tallyctl/export/textfile.h"

namespace tbdaily {

namespace {

constexpr MetricDescription kReportDay{"tbdaily_report_day_timestamp_seconds", "gauge",
                                       "Begin of the day that the newest report is of."};
constexpr MetricDescription kScalar{"tbdaily_scalar", "gauge", "Scalar of the newest report, by its key."};
constexpr MetricDescription kHistogram{
    "tbdaily_distribution", "histogram",
    "Values of a day in the newest report, of keys that are reported with a histogram."};

// Of a distribution's statistics, each a gauge of its own.
struct StatisticMetric {
  MetricDescription description;
  double (*value)(const DistributionStatistics& statistics);
};
constexpr StatisticMetric kStatistics[] = {
    {{"tbdaily_distribution_minimum", "gauge", "Smallest value of the day in the newest report."},
     [](const DistributionStatistics& statistics) { return statistics.minimum; }},
    {{"tbdaily_distribution_maximum", "gauge", "Largest value of the day in the newest report."},
     [](const DistributionStatistics& statistics) { return statistics.maximum; }},
    {{"tbdaily_distribution_mean", "gauge", "Mean of the day's values in the newest report."},
     [](const DistributionStatistics& statistics) { return statistics.mean; }},
    {{"tbdaily_distribution_stddev", "gauge", "Standard deviation of the day's values in the newest report."},
     [](const DistributionStatistics& statistics) { return statistics.standardDeviation(); }},
};
constexpr MetricDescription kValues{"tbdaily_distribution_values", "gauge",
                                    "Number of the day's values in the newest report."};

std::size_t appendScalars(std::string& text, const PlistDictionary& scalars) {
  Metric metric(text, kScalar);
  std::size_t leftOut = 0;
  for (const auto& [key, value] : scalars) {
    const auto integer = value.asInteger();
    integer ? metric.add({{"key", key}}, *integer) : void(++leftOut);
  }
  return leftOut;
}

std::size_t appendStatistics(std::string& text, const PlistDictionary& distributions) {
  for (const auto& [description, valueOf] : kStatistics) {
    Metric metric(text, description);
    for (const auto& [key, value] : distributions) {
      if (const auto statistics = distributionStatistics(value))
        metric.add({{"key", key}}, valueOf(*statistics));
    }
  }
  Metric metric(text, kValues);
  std::size_t leftOut = 0;
  for (const auto& [key, value] : distributions) {
    const auto statistics = distributionStatistics(value);
    statistics ? metric.add({{"key", key}}, statistics->count) : void(++leftOut);
  }
  return leftOut;
}

// Each bound has its count; one that nothing lies below too, so that what is read between two of them is
// right. Nothing when an entry is no bucket.
std::optional<MetricBuckets> bucketsOf(const PlistValue& histogram) {
  if (histogram.asDictionary() == nullptr) return std::nullopt;
  MetricBuckets buckets;
  for (const auto& [label, entry] : *histogram.asDictionary()) {
    const auto bounds = bucketBounds(label);
    const auto count = entry.asInteger();
    if (!bounds || !count || *count < 0) return std::nullopt;
    buckets.try_emplace(bounds->lower);
    buckets[bounds->upper] += static_cast<std::uint64_t>(*count);
  }
  return buckets;
}

std::size_t appendHistograms(std::string& text, const DailyReport& report) {
  Metric metric(text, kHistogram);
  std::size_t leftOut = 0;
  for (const auto& [key, histogram] : report.histograms()) {
    const auto buckets = bucketsOf(histogram);
    const auto statistics = distributionStatistics(report.distributions().get(key));
    if (buckets && statistics)
      metric.add({{"key", key}}, *buckets, statistics->mean * static_cast<double>(statistics->count));
    else
      ++leftOut;
  }
  return leftOut;
}

}  // namespace

std::string appendReportMetrics(std::string& text, const DailyReport& report) {
  const auto start = report.start();
  if (start && isRepresentable(*start)) Metric(text, kReportDay).add({}, start->unixSeconds());
  const std::size_t leftOut = appendScalars(text, report.scalars()) +
                              appendStatistics(text, report.distributions()) + appendHistograms(text, report);
  if (leftOut == 0) return {};
  return "entries that are left out, since they are no scalars, distributions or histograms: " +
         std::to_string(leftOut);
}

}  // namespace tbdaily
