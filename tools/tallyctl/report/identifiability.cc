#include "tools/tallyctl/report/identifiability.h"

#include <algorithm>
#include <cmath>

namespace tbdaily {

namespace {

constexpr std::uint64_t kLargestMagnitude = std::uint64_t{1} << 63;
constexpr std::uint64_t kMostDigits = 19;  // of kLargestMagnitude
// Minimum, maximum, mean and deviations give away as many values as there are equations.
constexpr std::int64_t kFewValues = 4;
constexpr std::string_view kWhitelisted[] = {"TBScalars", "TBDistributions", "TBDistributionsHistogram"};

// Multiples of the interval on both sides of 0, and 0.
std::uint64_t multiplesOf(std::uint64_t interval) {
  if (interval == 0) return 1;
  return 2 * ((kLargestMagnitude + interval / 2) / interval) + 1;
}

// 0, and on both sides of it all magnitudes of at most so many digits, and 9 * 10^(figures - 1) for each
// digit more.
std::uint64_t withFigures(std::uint64_t figures) {
  // Without a figure the powers of ten are left: 1, 10, ... 10^19.
  if (figures == 0) return 2 * (kMostDigits + 1) + 1;
  std::uint64_t power = 1;  // 10^figures
  for (std::uint64_t i = 0; i < figures; ++i) power *= 10;
  const std::uint64_t ofEachLength = power / 10 * 9;
  std::uint64_t onOneSide = power;
  std::uint64_t step = 10;
  for (std::uint64_t digits = figures + 1; digits < kMostDigits; ++digits) {
    onOneSide += ofEachLength;
    step *= 10;
  }
  // Of the longest only those up to the largest magnitude, rounded.
  onOneSide += (kLargestMagnitude + step / 2) / step - power / 10;
  return 2 * onOneSide + 1;
}

}  // namespace

std::optional<std::uint64_t> distinctScalars(const PlistDictionary& options) {
  std::optional<std::uint64_t> values;
  if (const auto interval = options.get(whitelist_option::kBucketInterval).asNumber();
      interval && interval->toUInt64() != 1)
    values = multiplesOf(interval->toUInt64());
  if (const auto figures = options.get(whitelist_option::kSignificantFigures).asNumber();
      figures && figures->toUInt64() < kMostDigits)
    values = std::min(values.value_or(UINT64_MAX), withFigures(figures->toUInt64()));
  return values;
}

std::optional<double> KeyIdentifiability::bits() const {
  return values ? std::optional(std::log2(static_cast<double>(*values))) : std::nullopt;
}

Identifiability identifiabilityOf(const DailyReport& report, const TBConfig& whitelist) {
  Identifiability found;
  for (const auto& [key, value] : report.scalars()) {
    const PlistDictionary* options = whitelist.configOptionsForScalarKey(key);
    found.keys.push_back(
        {key, KeyKind::Scalar, options != nullptr ? distinctScalars(*options) : std::nullopt, false});
  }
  for (const auto& [key, value] : report.distributions()) {
    const auto statistics = distributionStatistics(value);
    const bool isFew = statistics && statistics->count > 0 && statistics->count <= kFewValues;
    found.keys.push_back({key, KeyKind::Distribution, std::nullopt, isFew});
  }
  for (const auto& [name, value] : report.root()) {
    if (std::find(std::begin(kWhitelisted), std::end(kWhitelisted), name) != std::end(kWhitelisted)) continue;
    if (name != "TBMetadata" || value.asDictionary() == nullptr) {
      found.outside.push_back(name);
      continue;
    }
    for (const auto& [key, unused] : *value.asDictionary()) found.outside.push_back(key);
  }
  return found;
}

}  // namespace tbdaily
