#include "report/scalar_rounding.h"

#include <cmath>
#include <limits>

#include "report/tb_config.h"

namespace tbdaily {

std::int64_t roundedToInterval(std::int64_t value, std::uint64_t interval) {
  if (interval == 0) return 0;
  const auto bits = static_cast<std::uint64_t>(value);
  const std::uint64_t magnitude = value < 0 ? 0 - bits : bits;
  const std::uint64_t rounded = (magnitude + interval / 2) / interval * interval;
  if (value >= 0) return static_cast<std::int64_t>(rounded);
  constexpr std::uint64_t kLargestMagnitude = std::uint64_t{1} << 63;
  if (rounded >= kLargestMagnitude) return std::numeric_limits<std::int64_t>::min();
  return -static_cast<std::int64_t>(rounded);
}

std::int64_t roundedToSignificantFigures(std::int64_t value, std::uint64_t figures) {
  const double magnitude = std::fabs(static_cast<double>(value));
  const auto digits = static_cast<std::uint64_t>(std::ceil(std::log10(magnitude)));
  const auto dropped = static_cast<std::int64_t>(digits - figures);
  if (dropped < 1) return value;
  const double power = std::pow(10.0, static_cast<double>(dropped));
  return saturatingInt64(power * std::round(static_cast<double>(value) / power));
}

std::int64_t roundedScalar(std::int64_t value, const PlistDictionary& options) {
  if (options.empty()) return value;
  const auto number = [&options](std::string_view key) { return options.get(key).asNumber(); };
  if (const auto interval = number(whitelist_option::kBucketInterval)) {
    value = roundedToInterval(value, interval->toUInt64());
  }
  if (value == 0) return value;
  if (const auto figures = number(whitelist_option::kSignificantFigures)) {
    value = roundedToSignificantFigures(value, figures->toUInt64());
  }
  return value;
}

}  // namespace tbdaily
