// What went through the network interfaces.
#include <array>

#include "platform/linux/live/live_drivers.h"

namespace tbdaily {

namespace {

constexpr std::string_view kInterfaces = "/sys/class/net";

// The sum of a file of each direction, or of one direction.
struct Figure {
  std::string_view name;
  std::array<std::string_view, 2> files;
  LiveUnit unit;
  bool isInTotals;
};
constexpr std::array<Figure, 6> kFigures{{
    {"receivedBytes", {"rx_bytes"}, LiveUnit::Bytes, true},
    {"sentBytes", {"tx_bytes"}, LiveUnit::Bytes, true},
    {"receivedPackets", {"rx_packets"}, LiveUnit::Packets, false},
    {"sentPackets", {"tx_packets"}, LiveUnit::Packets, false},
    {"errors", {"rx_errors", "tx_errors"}, LiveUnit::Events, false},
    {"drops", {"rx_dropped", "tx_dropped"}, LiveUnit::Events, false},
}};

// Nothing where one of the files cannot be read.
std::optional<std::vector<Slot>> slotsOf(LiveDiscovery& discovery, const std::string& interface,
                                         const Figure& figure) {
  std::vector<Slot> slots;
  for (const std::string_view file : figure.files) {
    if (file.empty()) continue;
    const auto slot = discovery.number(pathOf({kInterfaces, interface, "statistics", file}));
    if (!slot) return std::nullopt;
    slots.push_back(*slot);
  }
  return slots;
}

}  // namespace

void discoverNetwork(LiveDiscovery& discovery) {
  const std::vector<std::string> interfaces = discovery.names(kInterfaces);
  for (const Figure& figure : kFigures) {
    LiveWord sum;
    for (const std::string& interface : interfaces) {
      const bool isHardware = discovery.has(pathOf({kInterfaces, interface, "device"}));
      const auto slots =
          figure.isInTotals && isHardware ? slotsOf(discovery, interface, figure) : std::nullopt;
      if (slots) sum.slots.insert(sum.slots.end(), slots->begin(), slots->end());
    }
    if (!sum.slots.empty())
      discovery.addSimple("totals", {}, dotted({"net", figure.name}), figure.unit, std::move(sum));
  }
  for (const std::string& interface : interfaces) {
    if (interface == "lo") continue;
    const std::string name = liveName(interface);
    for (const Figure& figure : kFigures) {
      if (auto slots = slotsOf(discovery, interface, figure))
        discovery.addSimple("interfaces", name, dotted({"net", name, figure.name}), figure.unit,
                            {std::move(*slots)}, figure.files[0]);
    }
  }
}

}  // namespace tbdaily
