// Samples over time.
#pragma once

#include <cstdint>

#include "tools/tallyctl/metrics/print.h"

namespace tbdaily {

// What changed within so many seconds.
void runMetricsDelta(Tool& tool, const MetricsRequest& request, double interval);

// A sample every so many seconds, `count` of them or, with 0, until the command is told to end.
void runMetricsWatch(Tool& tool, const MetricsRequest& request, double interval, std::uint64_t count);

}  // namespace tbdaily
