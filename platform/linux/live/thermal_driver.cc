// The thermal zones.
#include "platform/linux/live/live_drivers.h"

namespace tbdaily {

void discoverThermalZones(LiveDiscovery& discovery) {
  constexpr std::string_view kZones = "/sys/class/thermal", kZone = "thermal_zone";
  for (const std::string& zone : discovery.numbered(kZones, kZone)) {
    const auto type = discovery.name(pathOf({kZones, zone, "type"}));
    const auto temperature = discovery.number(pathOf({kZones, zone, "temp"}), NumberRange::Signed);
    if (type && temperature)
      discovery.addSimple("zones", {}, dotted({"thermal", *type, zone.substr(kZone.size()), "temperature"}),
                          LiveUnit::Millicelsius, {{*temperature}});
  }
}

}  // namespace tbdaily
