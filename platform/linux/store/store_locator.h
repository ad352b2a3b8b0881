// Where the analytics store's file lies on the host.
#pragma once

#include <functional>
#include <optional>

#include "platform/analytics_home.h"
#include "platform/linux/base/host.h"
#include "platform/linux/store/store_place.h"

namespace tbdaily {

// The store's place; nothing while there is no home for it or no device root.
using AnalyticsStoreLocator = std::function<std::optional<StorePlace>()>;

// All its places share one condition. Borrows both for as long as the locator or a copy of it is used.
AnalyticsStoreLocator analyticsStoreLocator(const Host& host, AnalyticsHome& home);

}  // namespace tbdaily
