// The device's health and usage figures of the moment.
#pragma once

#include "platform/platform.h"

namespace tbdaily {

// Records the network usage of the processes. Nothing that it meets stops the daily run.
void CollectDailyDeviceMetrics(Platform& platform);

}  // namespace tbdaily
