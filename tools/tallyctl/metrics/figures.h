// Figures with their units as people say them, beside the raw ones.
#pragma once

#include <cstdint>
#include <string>

namespace tbdaily {

// "24.1 GB", "3 h 12 min", "42.5 C", "1.05 V", "12.3 M" of a count: three digits, decimal prefixes. Empty
// where it would say no more than the figure with its unit does, and for a missing number or a unit without
// one.
std::string humanFigure(std::int64_t value, std::int64_t unit);

// What so many of the unit in each second are: "1.2 MB/s", "35.0 %" of a time, "12.3 W" of an energy, "250/s"
// of a count. Empty for what no one adds up: temperatures, powers and the like.
std::string humanRate(double perSecond, std::int64_t unit);

// "8.80 TB": three digits, decimal prefixes; "512 B" below a thousand.
std::string humanBytes(double bytes);

// "95 s", "12 min 5 s", "520 d 0 h".
std::string humanTime(double seconds);

}  // namespace tbdaily
