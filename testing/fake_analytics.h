// The analytics client and history in memory.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/analytics_client.h"
#include "platform/analytics_history.h"

namespace tbdaily::testing {

class FakeAnalyticsClient : public AnalyticsClient {
 public:
  DayNumber today = 0;
  std::vector<std::string> calls;  // "checkpoint", "set KEY VALUE", "add KEY VALUE", in order

  DayNumber currentDayNumber() override { return today; }
  DayNumber dayNumberOfDate(PlistDate date) override { return dayNumberOf(date); }
  PlistDate dateOfDayNumber(DayNumber day) override { return dateOf(day); }
  void checkpoint() override { calls.emplace_back("checkpoint"); }
  void setValueForScalarKey(std::string_view key, std::int64_t value) override {
    calls.push_back("set " + std::string(key) + " " + std::to_string(value));
  }
  void addValueForScalarKey(std::string_view key, std::int64_t increment) override {
    calls.push_back("add " + std::string(key) + " " + std::to_string(increment));
  }
};

class FakeAnalyticsHistory : public AnalyticsHistory {
 public:
  int opens = 0;
  int valuesAskedFor = 0;  // calls of nextValue, over all rows

  void addScalar(std::string_view key, DayNumber day, std::int64_t value) {
    rows_.scalars[{std::string(key), day}] = value;
  }
  // Appends to the row.
  void addDistribution(std::string_view key, DayNumber day, const std::vector<double>& values) {
    std::vector<double>& row = rows_.distributions[{std::string(key), day}];
    row.insert(row.end(), values.begin(), values.end());
  }

  std::unique_ptr<OpenAnalyticsHistory> open() override {
    ++opens;
    return std::make_unique<Opened>(rows_, valuesAskedFor);
  }

 private:
  using Row = std::pair<std::string, DayNumber>;  // its order is that of the enumerations

  struct Rows {
    std::map<Row, std::int64_t> scalars;
    std::map<Row, std::vector<double>> distributions;
  };

  class Values : public DistributionEnumerator {
   public:
    Values(const std::vector<double>& values, int& askedFor) : values_(values), askedFor_(askedFor) {}
    bool nextValue(double& value, std::int32_t& secondsInDay) override {
      ++askedFor_;
      if (next_ == values_.size()) return false;
      value = values_[next_++];
      secondsInDay = 0;
      return true;
    }

   private:
    const std::vector<double>& values_;
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
