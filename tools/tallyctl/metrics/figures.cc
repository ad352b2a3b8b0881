#include "tools/tallyctl/metrics/figures.h"

#include <array>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <optional>
#include <string_view>

#include "drivermetrics/kd_report.h"
#include "tools/tallyctl/terminal.h"

namespace tbdaily {

using namespace kdreport;

namespace {

constexpr double kBitsOfAByte = 8, kMinute = 60, kHour = 3600, kDay = 86400;

// How a quantity is said; without a row it is not.
struct Saying {
  std::uint8_t quantity;
  std::string_view base;  // of the figure
  std::string_view rate;  // of so much each second; empty: says nothing
  bool scales;            // takes prefixes
};
constexpr std::array<Saying, 13> kSayings{{
    {kKdReportCount, "", "/s", true},
    {kKdReportTime, "s", "%", true},
    {kKdReportPower, "W", "", true},
    {kKdReportEnergy, "J", "W", true},
    {kKdReportCurrent, "A", "", true},
    {kKdReportVoltage, "V", "", true},
    {kKdReportCapacitance, "F", "", true},
    {kKdReportInductance, "H", "", true},
    {kKdReportFrequency, "Hz", "", true},
    {kKdReportInformation, "B", "B/s", true},
    {kKdReportTemperature, "C", "", false},
    {kKdReportEvents, "", "/s", true},
    {kKdReportPackets, "", "/s", true},
}};

const Saying* sayingOf(std::int64_t unit) {
  if (unit == kKdReportInvalid) return nullptr;
  const std::uint8_t quantity = KdReportUnitGetQuantity(unit);
  for (const Saying& saying : kSayings) {
    if (saying.quantity == quantity) return &saying;
  }
  return nullptr;
}

// What one of the unit is in the base that the saying names; nothing for a scale without a number.
std::optional<double> factorOf(std::int64_t unit, const Saying& saying) {
  std::uint64_t numerator = 0, denominator = 0;
  if (KdReportUnitGetScale(unit, numerator, denominator) != 0 || numerator == 0 || denominator == 0)
    return std::nullopt;
  const double factor = static_cast<double>(numerator) / static_cast<double>(denominator);
  return saying.quantity == kKdReportInformation ? factor / kBitsOfAByte : factor;
}

// Three digits, as many behind the point as that leaves.
std::string threeDigits(double value) {
  const double magnitude = std::fabs(value);
  return withDigits(value, magnitude < 9.995 ? 2 : magnitude < 99.95 ? 1 : 0);
}

std::string withPrefix(double value, std::string_view base) {
  static constexpr std::array<std::string_view, 11> kPrefixes{"p", "n", "u", "m", "", "k",
                                                              "M", "G", "T", "P", "E"};
  constexpr std::size_t kNone = 4;
  std::size_t at = kNone;
  // Nobody says millibytes, nor a thousandth of an event.
  const bool divides = base != "B" && base != "B/s" && base != "/s" && !base.empty();
  while (std::fabs(value) >= 999.5 && at + 1 < kPrefixes.size()) value /= 1000, ++at;
  while (divides && value != 0 && std::fabs(value) < 0.9995 && at > 0) value *= 1000, --at;
  std::string text = threeDigits(value);
  const bool joins = base == "/s";
  if (at != kNone || (!base.empty() && !joins)) text += " ";
  return text.append(kPrefixes[at]).append(base);
}

// So much of a larger and of a smaller part of time.
std::string inTwo(double seconds, double larger, std::string_view largerName, double smaller,
                  std::string_view smallerName) {
  const double whole = std::floor(seconds / larger);
  return withDigits(whole, 0)
      .append(largerName)
      .append(" ")
      .append(withDigits(std::floor((seconds - whole * larger) / smaller), 0))
      .append(smallerName);
}

// Seconds below two minutes; above that the two largest of days, hours, minutes and seconds.
std::string duration(double seconds) {
  const double magnitude = std::fabs(seconds);
  if (magnitude < 2 * kMinute) return withPrefix(seconds, "s");
  const std::string sign = seconds < 0 ? "-" : "";
  if (magnitude < 2 * kHour) return sign + inTwo(magnitude, kMinute, " min", 1, " s");
  if (magnitude < 2 * kDay) return sign + inTwo(magnitude, kHour, " h", kMinute, " min");
  return sign + inTwo(magnitude, kDay, " d", kHour, " h");
}

}  // namespace

std::string humanFigure(std::int64_t value, std::int64_t unit) {
  const Saying* saying = sayingOf(unit);
  if (saying == nullptr || value == kKdReportInvalid) return {};
  const auto factor = factorOf(unit, *saying);
  if (!factor) return {};
  const double figure = static_cast<double>(value) * *factor;
  const bool isLong = saying->quantity == kKdReportTime && std::fabs(figure) >= 2 * kMinute;
  if (std::abs(value) < 1000 && !isLong) return {};  // read as it is
  if (saying->quantity == kKdReportTime) return duration(figure);
  return saying->scales ? withPrefix(figure, saying->base)
                        : withDigits(figure, 1).append(" ").append(saying->base);
}

std::string humanRate(double perSecond, std::int64_t unit) {
  const Saying* saying = sayingOf(unit);
  if (saying == nullptr || saying->rate.empty() || !std::isfinite(perSecond)) return {};
  const auto factor = factorOf(unit, *saying);
  if (!factor) return {};
  const double rate = perSecond * *factor;
  if (rate == 0) return "0";
  return saying->quantity == kKdReportTime ? withDigits(rate * 100, 1) + " %"
                                           : withPrefix(rate, saying->rate);
}

std::string humanBytes(double bytes) {
  if (std::fabs(bytes) < 999.5) return withDigits(bytes, 0) + " B";
  return withPrefix(bytes, "B");
}

std::string humanTime(double seconds) {
  if (std::fabs(seconds) < 2 * kMinute) return withDigits(seconds, 0) + " s";
  return duration(seconds);
}

}  // namespace tbdaily
