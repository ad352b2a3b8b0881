// The scale of a chart: round figures.
#pragma once

#include <algorithm>
#include <cmath>

namespace tbdaily {

struct ChartScale {
  double base = 0;
  double step = 1;
  int steps = 1;

  double at(int i) const { return base + step * i; }
  // The share of the scale that the value takes, from 0 to 1.
  double share(double value) const { return std::clamp((value - base) / (step * steps), 0.0, 1.0); }
};

// From at most the smallest value to at least the largest, in a few steps of 1, 2 or 5 times a power of ten;
// for values that are never broken, like counts, no step is below 1. Both are finite.
inline ChartScale chartScale(double smallest, double largest, bool isWhole) {
  const double range = largest - smallest;
  double step = 1;
  if (range > 0 && std::isfinite(range)) {
    step = std::pow(10, std::floor(std::log10(range / 5)));
    for (const double factor : {2.0, 2.5, 2.0}) {
      if (step * 5 >= range) break;
      step *= factor;
    }
    if (isWhole) step = std::max(step, 1.0);
  }
  const double base = std::floor(smallest / step) * step;
  const double steps = std::ceil((largest - base) / step - 1e-9);
  return {base, step, static_cast<int>(std::clamp(steps, 1.0, 10.0))};
}

}  // namespace tbdaily
