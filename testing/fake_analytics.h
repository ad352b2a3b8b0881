// The analytics client and history in memory.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <span>
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
  int roomForLoads = 1000;         // how often it takes increments that come together
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
  bool addValuesForScalarKeys(std::span<const ScalarFigure> increments) override {
    return roomForLoads-- > 0 && AnalyticsClient::addValuesForScalarKeys(increments);
  }
};

class FakeAnalyticsHistory : public AnalyticsHistory {
 public:
  bool isWhole = true;     // what an opened history says of itself
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
    auto opened = std::make_unique<Opened>(rows_, valuesAskedFor);
    opened->whole = isWhole;
    return opened;
  }

 private:
  using Row = std::pair<std::string, DayNumber>;  // its order is that of the enumerations
  struct Rows {
    std::map<Row, std::int64_t> scalars;
    std::map<Row, std::vector<double>> distributions;
  };

  struct Values : DistributionEnumerator {
    Values(std::span<const double> row, int& calls) : values(row), askedFor(calls) {}
    bool nextValue(double& value, std::int32_t& secondsInDay) override {
      ++askedFor;
      if (values.empty()) return false;
      value = values.front();
      secondsInDay = 0;
      values = values.subspan(1);
      return true;
    }
    std::span<const double> values;
    int& askedFor;
  };

  struct Opened : OpenAnalyticsHistory {
    Opened(Rows current, int& calls) : rows(std::move(current)), askedFor(calls) {}
    void enumerateScalars(std::string_view keyPrefix, DayNumber minimumDay, DayNumber maximumDay,
                          const ScalarRowCallback& row) override {
      bool stop = false;
      for (const auto& [place, value] : rows.scalars) {
        const auto& [key, day] = place;
        if (!stop && key.starts_with(keyPrefix) && day >= minimumDay && day <= maximumDay)
          row(key, day, value, stop);
      }
    }
    void enumerateDistributions(std::string_view keyPrefix, DayNumber minimumDay, DayNumber maximumDay,
                                const DistributionRowCallback& row) override {
      bool stop = false;
      for (const auto& [place, values] : rows.distributions) {
        const auto& [key, day] = place;
        Values enumerator(values, askedFor);
        if (!stop && key.starts_with(keyPrefix) && day >= minimumDay && day <= maximumDay)
          row(key, day, enumerator, stop);
      }
    }
    bool isWhole() const override { return whole; }
    Rows rows;
    int& askedFor;
    bool whole = true;
  };

  Rows rows_;
};

}  // namespace tbdaily::testing
