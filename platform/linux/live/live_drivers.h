// What the drivers of a live host find.
#pragma once

#include <array>
#include <cstdint>
#include <string_view>

#include "platform/linux/live/live_discovery.h"

namespace tbdaily {

void discoverProcessors(LiveDiscovery& discovery);
void discoverPressure(LiveDiscovery& discovery);
void discoverMemory(LiveDiscovery& discovery);
void discoverDisks(LiveDiscovery& discovery);
void discoverNetwork(LiveDiscovery& discovery);
void discoverThermalZones(LiveDiscovery& discovery);
void discoverSensors(LiveDiscovery& discovery);
void discoverPowerZones(LiveDiscovery& discovery);

// The drivers whose sources are texts of /proc and /sys. A driver is a function in a file of its own and a
// line here.
struct LiveDriver {
  std::string_view name;
  std::uint64_t identifier;
  void (*discover)(LiveDiscovery& discovery);
};
inline constexpr std::array<LiveDriver, 8> kTextDrivers{{
    {"cpu", 16, discoverProcessors},
    {"pressure", 17, discoverPressure},
    {"memory", 18, discoverMemory},
    {"disk", 19, discoverDisks},
    {"network", 20, discoverNetwork},
    {"thermal", 21, discoverThermalZones},
    {"sensors", 22, discoverSensors},
    {"power", 23, discoverPowerZones},
}};

}  // namespace tbdaily
