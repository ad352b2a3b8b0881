#include "driver/device_metrics.h"

namespace tbdaily {

void CollectDailyDeviceMetrics(Platform&) {}

}  // namespace tbdaily
