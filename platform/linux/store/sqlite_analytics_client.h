// The analytics client over the store's file and the kernel's clock.
//
// A write that fails is lost and named on standard error. Operations may come from several threads.
#pragma once

#include <mutex>
#include <optional>

#include "platform/analytics_client.h"
#include "platform/kernel.h"
#include "platform/linux/store/analytics_store.h"
#include "platform/linux/store/store_locator.h"

namespace tbdaily {

class SqliteAnalyticsClient : public AnalyticsClient {
 public:
  SqliteAnalyticsClient(AnalyticsStoreLocator locate, Kernel& kernel);

  DayNumber currentDayNumber() override;
  DayNumber dayNumberOfDate(PlistDate date) override;
  PlistDate dateOfDayNumber(DayNumber day) override;
  void checkpoint() override;
  void setValueForScalarKey(std::string_view key, std::int64_t value) override;
  void addValueForScalarKey(std::string_view key, std::int64_t increment) override;
  // In one transaction; a figure that is refused does not keep the others from being written.
  void setValuesForScalarKeys(std::span<const ScalarFigure> values) override;
  // The same, but a failure of the store keeps all of them from being written.
  [[nodiscard]] bool addValuesForScalarKeys(std::span<const ScalarFigure> increments) override;

 private:
  using Write = StoreResult (AnalyticsStore::*)(std::string_view key, DayNumber day, std::int64_t number);
  void writeOne(Write write, const ScalarFigure& figure);
  enum class AfterFailure : bool { KeepTheRest, KeepNone };
  // Whether the store did what it was asked for.
  bool writeAll(Write write, std::span<const ScalarFigure> figures, AfterFailure afterFailure);
  // Null while the store has no place.
  AnalyticsStore* store();

  AnalyticsStoreLocator locate_;
  Kernel& kernel_;
  std::mutex mutex_;  // over finding the store
  std::optional<AnalyticsStore> store_;
};

}  // namespace tbdaily
