// What a distribution is reduced to before it is reported: five statistics, and a histogram where boundaries
// are given.
#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "platform/plist_value.h"

namespace tbdaily {

// Running statistics of the values seen so far; all 0 before the first.
class DistributionSummary {
 public:
  void add(double value);

  // Minimum, maximum, mean, sum of squared deviations from the mean (not divided by the count), count.
  PlistValue statistics() const;

 private:
  double minimum_ = 0;
  double maximum_ = 0;
  double mean_ = 0;
  double squaredDeviations_ = 0;
  std::int64_t count_ = 0;
};

// The bucket of a value among n boundaries, 0 to n: the first boundary, in the order given, that is not below
// the value; n when there is none, or the value is not a number.
std::uint32_t determineHistBucketForValueWithIntervals(double value, std::span<const double> intervals);

// Label to count of every bucket that is not empty, for n boundaries (numbers) and n + 1 counts: "(-inf,
// 10]", "(10, 100]",
// "(100, inf)". None when all are empty.
PlistValue histogramDictForIntervalsWithHistCounts(const PlistArray& intervals,
                                                   std::span<const std::uint64_t> counts);

}  // namespace tbdaily
