// Unit codes: a quantity and a scale in 64 bits, taken apart into labels and exact factors.
#pragma once

#include "drivermetrics/kd_report.h"

namespace tbdaily {

// Seconds, unscaled.
inline constexpr std::int64_t kSecondsUnit = 0x0100000000000000;

// Prefix and quantity, such as "ms", "MiB", "events"; none for kKdReportInvalid.
std::optional<std::string> copyUnitLabel(std::int64_t unit);

// The low 56 bits of a unit code as numerator / denominator, in wrapping unsigned arithmetic. kKdBadArgument
// for ticks and pages of unknown size.
KdStatus getFactorsFromScale(std::uint64_t scale, std::uint64_t& numerator, std::uint64_t& denominator);

}  // namespace tbdaily
