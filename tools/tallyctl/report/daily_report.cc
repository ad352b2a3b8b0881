#include "tools/tallyctl/report/daily_report.h"

#include <algorithm>
#include <charconv>
#include <cmath>

namespace tbdaily {

namespace {

const PlistDictionary kNothing;

// What every report holds, and nothing else that the job writes or reads.
constexpr std::string_view kReportKeys[] = {"TBCrashLogVersion", "TBStartDate"};

bool readBound(std::string_view text, double& bound) {
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), bound);
  return error == std::errc() && end == text.data() + text.size() && !std::isnan(bound);
}

}  // namespace

std::optional<BucketBounds> bucketBounds(std::string_view label) {
  constexpr std::string_view kBetween = ", ";
  const std::size_t comma = label.find(kBetween);
  if (comma == std::string_view::npos || !label.starts_with('(') ||
      label.size() < comma + kBetween.size() + 2)
    return std::nullopt;
  BucketBounds bounds;
  bounds.lowerText = label.substr(1, comma - 1);
  bounds.upperText = label.substr(comma + kBetween.size());
  const bool isLast = bounds.upperText.ends_with(')');
  if (!isLast && !bounds.upperText.ends_with(']')) return std::nullopt;
  bounds.upperText.remove_suffix(1);
  if (!readBound(bounds.lowerText, bounds.lower) || !readBound(bounds.upperText, bounds.upper))
    return std::nullopt;
  return bounds;
}

std::string HistogramBucket::label() const {
  return "(" + lowerText + ", " + upperText + (std::isinf(upper) ? ")" : "]");
}

double DistributionStatistics::standardDeviation() const {
  return count > 0 ? std::sqrt(squaredDeviations / static_cast<double>(count)) : 0;
}

std::optional<DistributionStatistics> distributionStatistics(const PlistValue& value) {
  const PlistArray* fields = value.asArray();
  if (fields == nullptr || fields->size() != 5) return std::nullopt;
  double numbers[4];
  for (std::size_t i = 0; i < 4; ++i) {
    const auto number = (*fields)[i].asNumber();
    if (!number) return std::nullopt;
    numbers[i] = number->toDouble();
  }
  const auto count = (*fields)[4].asNumber();
  if (!count) return std::nullopt;
  return DistributionStatistics{numbers[0], numbers[1], numbers[2], numbers[3], count->toInt64()};
}

Outcome<DailyReport> DailyReport::decode(const PlistValue& root) {
  if (root.asDictionary() == nullptr) return Failure{"this is no daily report: its root is no dictionary"};
  for (const std::string_view key : kReportKeys) {
    if (!root.asDictionary()->contains(key))
      return Failure{"this is no daily report: it has no \"" + std::string(key) + "\""};
  }
  return DailyReport(root);
}

std::vector<HistogramBucket> DailyReport::buckets(std::string_view key) const {
  const PlistValue* found = histograms().find(key);
  const PlistDictionary* entries = found != nullptr ? found->asDictionary() : nullptr;
  std::vector<HistogramBucket> named;
  if (entries == nullptr) return named;
  for (const auto& [label, count] : *entries) {
    const auto bounds = bucketBounds(label);
    const auto number = count.asNumber();
    if (bounds && number)
      named.push_back({bounds->lower, bounds->upper, std::string(bounds->lowerText),
                       std::string(bounds->upperText), number->toInt64()});
  }
  std::ranges::sort(named, {}, &HistogramBucket::lower);
  std::vector<HistogramBucket> all;
  for (HistogramBucket& bucket : named) {
    if (!all.empty() && all.back().upper < bucket.lower)
      all.push_back({all.back().upper, bucket.lower, all.back().upperText, bucket.lowerText, 0});
    all.push_back(std::move(bucket));
  }
  return all;
}

const PlistDictionary& DailyReport::table(std::string_view name) const {
  const PlistValue* value = root().find(name);
  const PlistDictionary* dictionary = value != nullptr ? value->asDictionary() : nullptr;
  return dictionary != nullptr ? *dictionary : kNothing;
}

}  // namespace tbdaily
