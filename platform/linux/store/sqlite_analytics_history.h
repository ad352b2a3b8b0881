// The analytics history over the store's file.
//
// An open history holds one read transaction on a connection of its own, so that all its enumerations see one
// state of the store. Rows that no report can carry (an unusable key, a value of a foreign type) are passed
// over and named once on standard error, as is a store that cannot be read.
#pragma once

#include <functional>

#include "platform/analytics_history.h"
#include "platform/linux/store/store_file.h"
#include "platform/linux/store/store_locator.h"

namespace tbdaily {

class SqliteAnalyticsHistory : public AnalyticsHistory {
 public:
  explicit SqliteAnalyticsHistory(AnalyticsStoreLocator locate);
  // Over what the function opens of the place.
  SqliteAnalyticsHistory(AnalyticsStoreLocator locate, std::function<OpenedStore(const StorePlace&)> open);

  std::unique_ptr<OpenAnalyticsHistory> open() override;

 private:
  AnalyticsStoreLocator locate_;
  std::function<OpenedStore(const StorePlace&)> open_;
};

}  // namespace tbdaily
