// The analytics history over the store's file.
//
// An open history holds one read transaction on a connection of its own, so that all its enumerations see one
// state of the store. Rows that no report can carry (an unusable key, a value of a foreign type) are passed
// over and named once on standard error, as is a store that cannot be read.
#pragma once

#include <chrono>

#include "platform/analytics_history.h"
#include "platform/linux/store/store_file.h"
#include "platform/linux/store/store_locator.h"

namespace tbdaily {

class SqliteAnalyticsHistory : public AnalyticsHistory {
 public:
  explicit SqliteAnalyticsHistory(AnalyticsStoreLocator locate,
                                  std::chrono::milliseconds busyTimeout = kStoreBusyTimeout);

  std::unique_ptr<OpenAnalyticsHistory> open() override;

 private:
  AnalyticsStoreLocator locate_;
  std::chrono::milliseconds busyTimeout_;
};

}  // namespace tbdaily
