#include "tools/tallyctl/metrics/unit_argument.h"

#include <array>

#include "drivermetrics/kd_report.h"
#include "tools/tallyctl/metrics/selection.h"

namespace tbdaily {

using namespace kdreport;

namespace {

constexpr unsigned kQuantityShift = 56;
constexpr std::array<std::uint8_t, 13> kQuantities{
    kKdReportTime,        kKdReportPower,      kKdReportEnergy,    kKdReportCurrent,     kKdReportVoltage,
    kKdReportCapacitance, kKdReportInductance, kKdReportFrequency, kKdReportInformation, kKdReportTemperature,
    kKdReportEvents,      kKdReportPackets,    kKdReportCount};
// None, bytes, powers of ten from pico to tera, of two from kibi to tebi, in bits and in bytes.
constexpr std::array<std::uint64_t, 18> kScales{
    0,
    0x82'00'0000'0000,
    0x73'0000'0000,
    0x76'0000'0000,
    0x79'0000'0000,
    0x7C'0000'0000,
    0x82'0000'0000,
    0x85'0000'0000,
    0x88'0000'0000,
    0x8B'0000'0000,
    0x89'00'0000'0000,
    0x8C'00'0000'0000,
    0x93'00'0000'0000,
    0x96'00'0000'0000,
    0x9D'00'0000'0000,
    0xA0'00'0000'0000,
    0xA7'00'0000'0000,
    0xAA'00'0000'0000,
};

}  // namespace

std::optional<std::int64_t> parseUnit(const std::string& text) {
  if (const auto code = parseCode(text)) return static_cast<std::int64_t>(*code);
  if (text.empty()) return std::nullopt;
  for (const std::uint8_t quantity : kQuantities) {
    for (const std::uint64_t scale : kScales) {
      const auto unit = static_cast<std::int64_t>(std::uint64_t{quantity} << kQuantityShift | scale);
      if (KdReportCopyUnitLabel(unit) == text) return unit;
    }
  }
  return std::nullopt;
}

}  // namespace tbdaily
