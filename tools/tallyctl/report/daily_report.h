// A daily report, decoded: what the views, the page and the export read it by.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/plist_value.h"
#include "tools/tallyctl/outcome.h"

namespace tbdaily {

// The bounds that a bucket's label "(2.5, 10]" names: above the first, up to the second. The outermost have
// infinite ones. None for a text of another form.
struct BucketBounds {
  double lower = 0;                       // exclusive
  double upper = 0;                       // inclusive
  std::string_view lowerText, upperText;  // as the label has them; borrowed from it
};
std::optional<BucketBounds> bucketBounds(std::string_view label);

// A bucket of a histogram. A count of 0 stands for what lies between two buckets of the report, which names
// no empty ones: one gap, whatever boundaries divide it.
struct HistogramBucket {
  double lower = 0, upper = 0;
  std::string lowerText, upperText;
  std::int64_t count = 0;

  std::string label() const;  // "(2.5, 10]"
};

// The five statistics of a distribution, as they stand in the report.
struct DistributionStatistics {
  double minimum = 0, maximum = 0, mean = 0;
  double squaredDeviations = 0;  // from the mean, summed
  std::int64_t count = 0;

  // Of all values: the root of squaredDeviations / count. 0 without values.
  double standardDeviation() const;
};
// None unless the value is an array of five numbers.
std::optional<DistributionStatistics> distributionStatistics(const PlistValue& value);

// Borrows the report's root dictionary.
class DailyReport {
 public:
  // Why the value is none.
  static Outcome<DailyReport> decode(const PlistValue& root);

  const PlistDictionary& root() const { return *root_.asDictionary(); }
  std::optional<PlistDate> start() const { return root().get("TBStartDate").asDate(); }
  std::optional<PlistDate> created() const { return root().get("TBLogCreationDate").asDate(); }
  // Tables of the report; empty where it has none.
  const PlistDictionary& metadata() const { return table("TBMetadata"); }
  const PlistDictionary& scalars() const { return table("TBScalars"); }
  const PlistDictionary& distributions() const { return table("TBDistributions"); }
  const PlistDictionary& histograms() const { return table("TBDistributionsHistogram"); }
  // The buckets of a key's histogram in the order of their bounds, gaps filled; empty without one. What is no
  // bucket is left out.
  std::vector<HistogramBucket> buckets(std::string_view key) const;

 private:
  explicit DailyReport(PlistValue root) : root_(std::move(root)) {}
  const PlistDictionary& table(std::string_view name) const;

  PlistValue root_;
};

}  // namespace tbdaily
