// Where the analytics store lies: below "/var/mobile", or in a system group container when the device is in
// multi-user mode.
#pragma once

#include <filesystem>
#include <functional>
#include <optional>
#include <string>

#include "platform/device_answers.h"
#include "platform/file_system.h"
#include "platform/linux/host.h"

namespace tbdaily {

// As the device sees it; nothing when the container cannot be found.
std::optional<std::string> analyticsHome(DeviceAnswers& answers, FileSystem& files);

// The store's file on the host; nothing while there is no home for it or no device root. Asks at its first
// call and, after a failure, again.
using AnalyticsStoreLocator = std::function<std::optional<std::filesystem::path>()>;

// Borrows all three for as long as the locator or a copy of it is used.
AnalyticsStoreLocator analyticsStoreLocator(const Host& host, DeviceAnswers& answers, FileSystem& files);

}  // namespace tbdaily
