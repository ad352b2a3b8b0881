// How one sample device differs from another: its age, how much it is used, what its network is like.
#pragma once

#include <cmath>
#include <cstdint>

#include "tools/tallyctl/noise.h"

namespace tbdaily {

// Factors on what the sample device of seed 0 has.
struct SampleVariation {
  std::uint64_t seed = 0;
  double age = 1;
  double use = 1;
  double latency = 1;

  // The same for the same seed. Most devices are young and used a little; a few are old, or hardly off.
  static SampleVariation ofSeed(std::uint64_t seed) {
    if (seed == 0) return {};
    Noise noise(seed * 0xD1B54A32D192ED03);
    const double age = std::exp(noise.around(-0.4, 0.9));
    const double use = std::exp(noise.around(-0.2, 0.6));
    return {seed, age, use, std::exp(noise.around(0, 0.4))};
  }

  // Of a day's rows.
  Noise noiseOf(std::int64_t day) const { return Noise(static_cast<std::uint64_t>(day) + (seed << 32)); }
};

// What a figure of the sample device grows with; null: with nothing.
using VariationFactor = double SampleVariation::*;
inline double varied(double value, VariationFactor factor, const SampleVariation& variation) {
  return factor != nullptr ? value * (variation.*factor) : value;
}

}  // namespace tbdaily
