// Numbers that look like chance and are the same on every machine and in every run.
#pragma once

#include <cstdint>

namespace tbdaily {

class Noise {
 public:
  explicit Noise(std::uint64_t seed) : state_(seed) {}

  std::uint64_t next() {
    std::uint64_t n = state_ += 0x9E3779B97F4A7C15;
    n = (n ^ n >> 30) * 0xBF58476D1CE4E5B9;
    n = (n ^ n >> 27) * 0x94D049BB133111EB;
    return n ^ n >> 31;
  }
  // 0 to limit - 1; the limit is at least 1.
  std::uint64_t below(std::uint64_t limit) { return next() % limit; }
  // From 0 up to but not including 1.
  double unit() { return static_cast<double>(next() >> 11) * 0x1.0p-53; }
  double between(double low, double high) { return low + unit() * (high - low); }
  // Bell-shaped around the mean, three standard deviations wide.
  double around(double mean, double deviation) {
    return mean + deviation * 2 * (unit() + unit() + unit() - 1.5);
  }

 private:
  std::uint64_t state_;
};

}  // namespace tbdaily
