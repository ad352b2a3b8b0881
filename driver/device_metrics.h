// The device's health and usage figures of the moment, as analytics scalars and structured data logs.
#pragma once

#include "platform/platform.h"
#include "platform/plist_value.h"

namespace tbdaily {

// A step of the daily run: disk usage, storage telemetry, NAND info with the freezer's writes, kernel ECC
// events, network usage, driver metrics. Each part runs whatever became of the others, and nothing that it
// meets stops the daily run. Main thread only.
void CollectDailyDeviceMetrics(Platform& platform);

// The parts that are the step's own.
void CollectDiskUsage(Platform& platform);
void CollectNANDInfo(Platform& platform);
// Logs at most ten events of this run; none is read beyond that.
void CollectECCEvents(Platform& platform);

// The NAND info of the moment with the freezer's entries merged in, as the daily run records it.
PlistDictionary currentNANDInfo(Platform& platform);

}  // namespace tbdaily
