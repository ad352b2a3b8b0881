// The driver registry of a Linux host, for programs that link the driver metrics library: nothing else of the
// platform comes with it.
#pragma once

#include <memory>
#include <string_view>

#include "platform/driver_registry.h"

namespace kdreport {

// What is recorded under a device root (registry.plist, hub.plist); without a recording, and unless
// TBDAILY_LIVE is 0, what the host's own kernel measures. Without a root: the one that TBDAILY_ROOT names,
// else "/". Different subscriptions of it may be sampled in different threads.
[[nodiscard]] std::unique_ptr<tbdaily::DriverRegistry> openHostRegistry(std::string_view deviceRoot = {});

}  // namespace kdreport
