// The chips that watch temperatures, voltages, currents, power and fans.
#include <array>

#include "platform/linux/live/live_drivers.h"

namespace tbdaily {

namespace {

constexpr std::string_view kChips = "/sys/class/hwmon", kChip = "hwmon", kInput = "_input";

struct Kind {
  std::string_view stem;
  LiveUnit unit;
  NumberRange range;
};
constexpr std::array<Kind, 6> kKinds{{
    {"temp", LiveUnit::Millicelsius, NumberRange::Signed},
    {"in", LiveUnit::Millivolts, NumberRange::Signed},
    {"curr", LiveUnit::Milliamperes, NumberRange::Signed},
    {"power", LiveUnit::Microwatts, NumberRange::Signed},
    {"energy", LiveUnit::Microjoules, NumberRange::Counter},
    {"fan", LiveUnit::Count, NumberRange::Counter},
}};

}  // namespace

void discoverSensors(LiveDiscovery& discovery) {
  for (const std::string& chip : discovery.numbered(kChips, kChip)) {
    const std::string folder = pathOf({kChips, chip});
    const auto chipName = discovery.name(pathOf({folder, "name"}));
    if (!chipName) continue;
    const std::string group = dotted({*chipName, chip.substr(kChip.size())});
    for (const Kind& kind : kKinds) {
      for (const std::string& file : discovery.numbered(folder, kind.stem, kInput)) {
        const auto value = discovery.number(pathOf({folder, file}), kind.range);
        if (!value) continue;
        const std::string stem = file.substr(0, file.size() - kInput.size());
        const std::string label = discovery.name(pathOf({folder, stem}) + "_label").value_or(stem);
        discovery.addSimple(group, {}, dotted({"sensors", group, label}), kind.unit, {{*value}}, stem);
      }
    }
  }
}

}  // namespace tbdaily
