#include "driver/device_metrics.h"

#include "driver/data_usage.h"

namespace tbdaily {

void CollectDailyDeviceMetrics(Platform& platform) {
  CollectDataUsage(platform);
}

}  // namespace tbdaily
