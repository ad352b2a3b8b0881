// Unit codes: a quantity and a scale in 64 bits, taken apart into labels and exact factors.

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>

#include "drivermetrics/channel_record.h"

namespace kdreport {

namespace {

constexpr unsigned kQuantityShift = 56;
constexpr std::uint64_t kScaleMask = (std::uint64_t{1} << kQuantityShift) - 1;
constexpr unsigned kNotNumericShift = 48;  // any bit from here to the quantity: a scale without a number
constexpr unsigned kBinaryExponentShift = 40;
constexpr unsigned kDecimalExponentShift = 32;
constexpr unsigned kExponentBias = 127;
constexpr std::uint64_t kDivides = std::uint64_t{1} << 31;
constexpr std::uint64_t kFactorMask = kDivides - 1;

constexpr std::uint64_t kBitScale = 0;
constexpr std::uint64_t kByteScale = 0x820000000000;  // eight bits

struct QuantityLabel {
  std::uint8_t quantity;
  std::string_view label;
};
constexpr std::array<QuantityLabel, 12> kQuantityLabels = {{
    {kKdReportCount, ""},
    {kKdReportTime, "s"},
    {kKdReportPower, "W"},
    {kKdReportEnergy, "J"},
    {kKdReportCurrent, "A"},
    {kKdReportVoltage, "V"},
    {kKdReportCapacitance, "F"},
    {kKdReportInductance, "H"},
    {kKdReportFrequency, "Hz"},
    {kKdReportTemperature, "C"},
    {kKdReportEvents, "events"},
    {kKdReportPackets, "packets"},
}};
constexpr std::string_view kUnknownQuantity = "??";

struct ScaleLabel {
  std::uint64_t scale;
  std::string_view label;
};
constexpr std::array<ScaleLabel, 18> kScalePrefixes = {{
    {0x7300000000, "p"},
    {0x7600000000, "n"},
    {0x7900000000, "u"},
    {0x7C00000000, "m"},
    {0x8200000000, "k"},
    {0x8500000000, "M"},
    {0x8800000000, "G"},
    {0x8B00000000, "T"},
    {0x890000000000, "Ki"},
    {0x8C0000000000, "KiB"},
    {0x8C0000000004, "4KiB"},
    {0x8C0000000008, "8KiB"},
    {0x930000000000, "Mi"},
    {0x960000000000, "MiB"},
    {0x9D0000000000, "Gi"},
    {0xA00000000000, "GiB"},
    {0xA70000000000, "Ti"},
    {0xAA0000000000, "TiB"},
}};
// Scales that say all by themselves, whatever the quantity.
constexpr std::array<ScaleLabel, 4> kWholeLabels = {{
    {0x7600000001, "1Gticks"},
    {0x7980000018, "24Mticks"},
    {0x1000000000000, "hwticks?"},
    {0x2000000000000, "hwpage?"},
}};

template <std::size_t N>
const ScaleLabel* findScale(const std::array<ScaleLabel, N>& labels, std::uint64_t scale) {
  const auto found = std::ranges::find(labels, scale, &ScaleLabel::scale);
  return found != labels.end() ? &*found : nullptr;
}

std::string_view quantityLabel(std::uint8_t quantity, std::uint64_t scale) {
  if (quantity == kKdReportInformation) return scale == kByteScale ? "B" : scale == kBitScale ? "b" : "";
  const auto found = std::ranges::find(kQuantityLabels, quantity, &QuantityLabel::quantity);
  return found != kQuantityLabels.end() ? found->label : kUnknownQuantity;
}

std::uint8_t quantityOf(std::int64_t unit) {
  return static_cast<std::uint8_t>(static_cast<std::uint64_t>(unit) >> kQuantityShift);
}

std::uint64_t scaleOf(std::int64_t unit) {
  return static_cast<std::uint64_t>(unit) & kScaleMask;
}

// The exponent of a biased field that is not zero, -128 to 127.
int exponentOf(unsigned field) {
  return static_cast<std::int8_t>(static_cast<std::uint8_t>(field - kExponentBias));
}

std::uint64_t powerOfTen(int exponent) {
  std::uint64_t power = 1;
  for (int i = 0; i < exponent; ++i) power *= 10;
  return power;
}

std::uint64_t shiftedLeft(std::uint64_t value, int bits) {
  return bits < 64 ? value << bits : 0;
}

}  // namespace

std::optional<std::string> KdReportCopyUnitLabel(std::int64_t unit) {
  if (unit == kKdReportInvalid) return std::nullopt;
  const std::uint64_t scale = scaleOf(unit);
  if (const ScaleLabel* whole = findScale(kWholeLabels, scale)) return std::string(whole->label);
  const ScaleLabel* prefix = findScale(kScalePrefixes, scale);
  std::string label(prefix != nullptr ? prefix->label : "");
  return label.append(quantityLabel(quantityOf(unit), scale));
}

std::optional<std::string_view> KdReportChannelGetUnitLabel(const ChannelRecord* channel) {
  if (channel == nullptr) return std::nullopt;
  const PlistValue& cached = channel->cached(CachedAnswer::UnitLabel);
  if (!cached.isNone()) return cached.asString();
  const auto label = KdReportCopyUnitLabel(KdReportChannelGetUnit(channel));
  if (!label) return std::nullopt;
  return channel->cache(CachedAnswer::UnitLabel, PlistValue::string(*label)).asString();
}

PlistValue KdReportCreateUnitInfo(std::int64_t unit) {
  return PlistValue::dictionary({{std::string(kd_report_key::kChannelUnit), PlistValue::int64(unit)}});
}

std::uint8_t KdReportUnitGetQuantity(std::int64_t unit) {
  return quantityOf(unit);
}

KdStatus KdReportUnitGetScale(std::int64_t unit, std::uint64_t& numerator, std::uint64_t& denominator) {
  const std::uint64_t scale = scaleOf(unit);
  if (scale >> kNotNumericShift != 0) return kKdBadArgument;
  const std::uint64_t factor = std::max<std::uint64_t>(scale & kFactorMask, 1);
  const bool divides = (scale & kDivides) != 0;
  numerator = divides ? 1 : factor;
  denominator = divides ? factor : 1;
  if (const auto field = static_cast<unsigned>(scale >> kDecimalExponentShift & 0xFF); field != 0) {
    const int exponent = exponentOf(field);
    (exponent > 0 ? numerator : denominator) *= powerOfTen(std::abs(exponent));
  }
  if (const auto field = static_cast<unsigned>(scale >> kBinaryExponentShift & 0xFF); field != 0) {
    const int exponent = exponentOf(field);
    std::uint64_t& shifted = exponent > 0 ? numerator : denominator;
    shifted = shiftedLeft(shifted, std::abs(exponent));
  }
  return kKdSuccess;
}

double KdReportScaleValue(std::uint64_t value, std::int64_t fromUnit, std::int64_t toUnit) {
  constexpr double kNone = std::numeric_limits<double>::quiet_NaN();
  std::uint64_t fromNumerator = 0, fromDenominator = 0, toNumerator = 0, toDenominator = 0;
  if (quantityOf(fromUnit) != quantityOf(toUnit) ||
      KdReportUnitGetScale(fromUnit, fromNumerator, fromDenominator) != kKdSuccess ||
      KdReportUnitGetScale(toUnit, toNumerator, toDenominator) != kKdSuccess) {
    return kNone;
  }
  const double scaled = static_cast<double>(value) * static_cast<double>(fromNumerator) /
                        static_cast<double>(fromDenominator) / static_cast<double>(toNumerator) *
                        static_cast<double>(toDenominator);
  return std::isnan(scaled) ? kNone : scaled;  // one kind of NaN, so that its text has no sign
}

}  // namespace kdreport
