// The device's health and usage figures of the moment.
#pragma once

#include "platform/platform.h"

namespace tbdaily {

// Records nothing yet: no figure has a source on this platform so far.
void CollectDailyDeviceMetrics(Platform& platform);

}  // namespace tbdaily
