// The energy that the zones of the processor's power management used.
#include <algorithm>

#include "platform/linux/live/live_drivers.h"

namespace tbdaily {

namespace {

constexpr std::string_view kZones = "/sys/class/powercap";

struct Zone {
  std::string controlType;  // "intel-rapl"
  std::string name;         // "package-0.core"
  Slot energy;
};

// The names of a zone and of those around it, from the outermost on; nothing where one of them has none. A
// zone is called "intel-rapl:0:1" when it is the second one in "intel-rapl:0".
std::optional<std::string> zoneName(LiveDiscovery& discovery, const std::string& zone) {
  std::string name;
  for (std::size_t end = zone.find(':'); end != std::string::npos;) {
    end = zone.find(':', end + 1);
    const auto part = discovery.name(pathOf({kZones, zone.substr(0, end), "name"}));
    if (!part) return std::nullopt;
    name.append(name.empty() ? "" : ".").append(*part);
  }
  return name;
}

}  // namespace

void discoverPowerZones(LiveDiscovery& discovery) {
  std::vector<Zone> zones;
  for (const std::string& entry : discovery.names(kZones)) {
    if (entry.find(':') == std::string::npos) continue;  // the control type itself
    const auto name = zoneName(discovery, entry);
    const auto energy = discovery.number(pathOf({kZones, entry, "energy_uj"}));
    if (name && energy) zones.push_back({entry.substr(0, entry.find(':')), *name, *energy});
  }
  for (const Zone& zone : zones) {
    const bool isShared = std::ranges::any_of(zones, [&zone](const Zone& other) {
      return other.name == zone.name && other.controlType != zone.controlType;
    });
    const std::string name = isShared ? dotted({liveName(zone.controlType), zone.name}) : zone.name;
    discovery.addSimple("zones", {}, dotted({"power", name, "energy"}), LiveUnit::Microjoules,
                        {{zone.energy}}, "energy_uj");
  }
}

}  // namespace tbdaily
