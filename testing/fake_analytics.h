// The analytics client and history in memory.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/analytics_client.h"
#include "platform/analytics_history.h"

namespace tbdaily::testing {

class FakeAnalyticsClient : public AnalyticsClient {
 public:
  using Row = std::pair<std::string, DayNumber>;

  DayNumber today = 0;
  std::vector<std::string> calls;       // "checkpoint", "set KEY VALUE", "add KEY VALUE", in order
  std::map<Row, std::int64_t> scalars;  // what the calls come to

  DayNumber currentDayNumber() override { return today; }
  DayNumber dayNumberOfDate(PlistDate date) override { return dayNumberOf(date); }
  PlistDate dateOfDayNumber(DayNumber day) override { return dateOf(day); }
  void checkpoint() override { calls.emplace_back("checkpoint"); }
  void setValueForScalarKey(std::string_view key, std::int64_t value) override {
    record("set", key, value);
    scalars[{std::string(key), today}] = value;
  }
  void addValueForScalarKey(std::string_view key, std::int64_t increment) override {
    record("add", key, increment);
    std::int64_t& value = scalars[{std::string(key), today}];
    value =
        static_cast<std::int64_t>(static_cast<std::uint64_t>(value) + static_cast<std::uint64_t>(increment));
  }

  // The scalar of a key on a day, today's by default.
  std::optional<std::int64_t> scalar(std::string_view key,
                                     std::optional<DayNumber> day = std::nullopt) const {
    const auto place = scalars.find({std::string(key), day.value_or(today)});
    return place != scalars.end() ? std::optional(place->second) : std::nullopt;
  }

 private:
  void record(const char* call, std::string_view key, std::int64_t value) {
    calls.push_back(std::string(call).append(" ").append(key).append(" ").append(std::to_string(value)));
  }
};

class FakeAnalyticsHistory : public AnalyticsHistory {
 public:
  struct Value {
    double value = 0;
    std::int32_t secondsInDay = 0;
  };

  int opens = 0;
  int valuesAskedFor = 0;  // calls of nextValue, over all rows

  void addScalar(std::string_view key, DayNumber day, std::int64_t value) {
    rows_.scalars[{std::string(key), day}] = value;
  }
  // Appends to the row.
  void addDistribution(std::string_view key, DayNumber day, const std::vector<double>& values,
                       std::int32_t secondsInDay = 0) {
    std::vector<Value>& row = rows_.distributions[{std::string(key), day}];
    for (const double value : values) row.push_back({value, secondsInDay});
  }

  std::unique_ptr<OpenAnalyticsHistory> open() override {
    ++opens;
    return std::make_unique<Opened>(rows_, valuesAskedFor);
  }

 private:
  using Row = std::pair<std::string, DayNumber>;  // its order is that of the enumerations

  struct Rows {
    std::map<Row, std::int64_t> scalars;
    std::map<Row, std::vector<Value>> distributions;
  };

  class Values : public DistributionEnumerator {
   public:
    Values(const std::vector<Value>& values, int& askedFor) : values_(values), askedFor_(askedFor) {}
    bool nextValue(double& value, std::int32_t& secondsInDay) override {
      ++askedFor_;
      if (next_ == values_.size()) return false;
      value = values_[next_].value;
      secondsInDay = values_[next_].secondsInDay;
      ++next_;
      return true;
    }

   private:
    const std::vector<Value>& values_;
    int& askedFor_;
    std::size_t next_ = 0;
  };

  class Opened : public OpenAnalyticsHistory {
   public:
    Opened(Rows rows, int& valuesAskedFor) : rows_(std::move(rows)), valuesAskedFor_(valuesAskedFor) {}

    void enumerateScalars(std::string_view keyPrefix, DayNumber minimumDay, DayNumber maximumDay,
                          const ScalarRowCallback& row) override {
      bool stop = false;
      for (const auto& [place, value] : rows_.scalars) {
        if (isWanted(place, keyPrefix, minimumDay, maximumDay)) row(place.first, place.second, value, stop);
        if (stop) return;
      }
    }
    void enumerateDistributions(std::string_view keyPrefix, DayNumber minimumDay, DayNumber maximumDay,
                                const DistributionRowCallback& row) override {
      bool stop = false;
      for (const auto& [place, values] : rows_.distributions) {
        Values enumerator(values, valuesAskedFor_);
        if (isWanted(place, keyPrefix, minimumDay, maximumDay))
          row(place.first, place.second, enumerator, stop);
        if (stop) return;
      }
    }

   private:
    static bool isWanted(const Row& row, std::string_view prefix, DayNumber minimumDay,
                         DayNumber maximumDay) {
      return row.first.starts_with(prefix) && row.second >= minimumDay && row.second <= maximumDay;
    }
    Rows rows_;
    int& valuesAskedFor_;
  };

  Rows rows_;
};

}  // namespace tbdaily::testing
