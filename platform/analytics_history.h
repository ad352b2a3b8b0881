// The analytics store's rows by day.
//
// Absent or damaged store: no rows. Damage that shows only while rows are read:
// OpenAnalyticsHistory::isWhole.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <string_view>

#include "platform/analytics_client.h"

namespace tbdaily {

using DistributionVisitor = std::function<void(double value, std::int32_t secondsInDay)>;

// The values of one distribution row, one by one. Borrowed: valid during the row's callback.
class DistributionEnumerator {
 public:
  virtual ~DistributionEnumerator() = default;
  // False when no value is left; then the out-parameters are untouched.
  virtual bool nextValue(double& value, std::int32_t& secondsInDay) = 0;
  // All that are left, in order; none is left then. A store may have a shorter way.
  virtual void visitValues(const DistributionVisitor& visit) {
    double value = 0;
    std::int32_t secondsInDay = 0;
    while (nextValue(value, secondsInDay)) visit(value, secondsInDay);
  }
};

using ScalarRowCallback =
    std::function<void(std::string_view key, DayNumber day, std::int64_t value, bool& stop)>;
using DistributionRowCallback =
    std::function<void(std::string_view key, DayNumber day, DistributionEnumerator& values, bool& stop)>;

// An open history: one consistent view of the store. Closed by its destructor.
class OpenAnalyticsHistory {
 public:
  virtual ~OpenAnalyticsHistory() = default;

  // Rows of the keys that begin with the literal prefix and of the days from `minimumDay` to `maximumDay`,
  // both included, in order of key (bytes) and then of day. The callback runs synchronously; setting `stop`
  // ends the enumeration.
  virtual void enumerateScalars(std::string_view keyPrefix, DayNumber minimumDay, DayNumber maximumDay,
                                const ScalarRowCallback& row) = 0;
  // All values of one key and day are one row.
  virtual void enumerateDistributions(std::string_view keyPrefix, DayNumber minimumDay, DayNumber maximumDay,
                                      const DistributionRowCallback& row) = 0;

  // False when an enumeration met damage or could not go on: the rows that it delivered are a part of those
  // that there are, and no report may be made of them.
  virtual bool isWhole() const = 0;
};

class AnalyticsHistory {
 public:
  virtual ~AnalyticsHistory() = default;
  // Never null: a store that cannot be read gives a history without rows.
  virtual std::unique_ptr<OpenAnalyticsHistory> open() = 0;
};

}  // namespace tbdaily
