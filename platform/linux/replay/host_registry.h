// The driver registry of a Linux host for a program of its own: nothing else of the platform comes with it.
#pragma once

#include <memory>
#include <string_view>

#include "platform/driver_registry.h"

namespace tbdaily {

// What is recorded under a device root (registry.plist, hub.plist). Without a root: the one that TBDAILY_ROOT
// names, else "/". Answers as an absent registry where nothing is recorded. For one thread.
std::unique_ptr<DriverRegistry> openHostRegistry(std::string_view deviceRoot = {});

}  // namespace tbdaily
