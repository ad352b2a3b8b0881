// Where the analytics store's file lies on the host.
#pragma once

#include <filesystem>
#include <functional>
#include <optional>

#include "platform/analytics_home.h"
#include "platform/linux/base/host.h"

namespace tbdaily {

// The store's file on the host; nothing while there is no home for it or no device root.
using AnalyticsStoreLocator = std::function<std::optional<std::filesystem::path>()>;

// Borrows both for as long as the locator or a copy of it is used.
AnalyticsStoreLocator analyticsStoreLocator(const Host& host, AnalyticsHome& home);

}  // namespace tbdaily
