#include "report/distribution_summary.h"

#include "platform/number_text.h"

namespace tbdaily {

void DistributionSummary::add(double value) {
  if (count_ == 0) {
    minimum_ = maximum_ = mean_ = value;
    count_ = 1;
    return;
  }
  if (value < minimum_) {
    minimum_ = value;
  } else if (!(value <= maximum_)) {  // a value that is not a number replaces the maximum
    maximum_ = value;
  }
  const double delta = value - mean_;
  ++count_;
  mean_ += delta / static_cast<double>(count_);
  squaredDeviations_ += delta * (value - mean_);
}

PlistValue DistributionSummary::statistics() const {
  return PlistValue::array({PlistValue::float64(minimum_), PlistValue::float64(maximum_),
                            PlistValue::float64(mean_), PlistValue::float64(squaredDeviations_),
                            PlistValue::int32(static_cast<std::int32_t>(count_))});
}

std::uint32_t determineHistBucketForValueWithIntervals(double value, std::span<const double> intervals) {
  std::uint32_t bucket = 0;
  while (bucket < intervals.size() && !(intervals[bucket] >= value)) ++bucket;
  return bucket;
}

PlistValue histogramDictForIntervalsWithHistCounts(const PlistArray& intervals,
                                                   std::span<const std::uint64_t> counts) {
  const auto boundaryText = [&intervals](std::size_t i) {
    return numberText(intervals[i].asNumber().value_or(PlistNumber::float64(0)));
  };
  PlistDictionary histogram;
  for (std::size_t i = 0; i < counts.size(); ++i) {
    if (counts[i] == 0) continue;
    std::string label("(");
    label.append(i == 0 ? "-inf" : boundaryText(i - 1)).append(", ");
    label.append(i == intervals.size() ? "inf" : boundaryText(i)).append(i == intervals.size() ? ")" : "]");
    histogram.set(label, PlistValue::int64(static_cast<std::int64_t>(counts[i])));
  }
  return histogram.empty() ? PlistValue() : PlistValue::dictionary(std::move(histogram));
}

}  // namespace tbdaily
