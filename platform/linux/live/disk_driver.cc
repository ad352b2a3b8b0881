// What was read from and written to the disks.
#include <array>
#include <filesystem>
#include <system_error>

#include "platform/linux/live/live_drivers.h"

namespace tbdaily {

namespace {

constexpr std::string_view kDisks = "/sys/block";
constexpr std::int64_t kSector = 512;

// A word of the file "stat"; those with a name in the totals are summed over all disks.
struct Figure {
  std::string_view name;
  std::size_t word;
  LiveUnit unit;
  std::int64_t factor;
  bool isInTotals;
};
constexpr std::array<Figure, 7> kFigures{{
    {"readBytes", 2, LiveUnit::Bytes, kSector, true},
    {"writtenBytes", 6, LiveUnit::Bytes, kSector, true},
    {"reads", 0, LiveUnit::Events, 1, true},
    {"writes", 4, LiveUnit::Events, 1, true},
    {"discards", 11, LiveUnit::Events, 1, false},
    {"flushes", 15, LiveUnit::Events, 1, false},
    {"busyTime", 9, LiveUnit::Milliseconds, 1, false},
}};

// The head of a multipath drive counts what its paths count too.
bool isMultipathHead(const LiveDiscovery& discovery, const std::string& disk) {
  std::error_code ignored;
  const std::filesystem::path device =
      std::filesystem::canonical(discovery.place(pathOf({kDisks, disk, "device"})), ignored);
  return device.filename().native().starts_with("nvme-subsys");
}

}  // namespace

void discoverDisks(LiveDiscovery& discovery) {
  std::vector<std::string> disks = discovery.names(kDisks);
  std::erase_if(disks, [&](const std::string& disk) {
    return !discovery.has(pathOf({kDisks, disk, "device"}));
  });
  const auto slotOf = [&](const std::string& disk, const Figure& figure) {
    return discovery.cell(pathOf({kDisks, disk, "stat"}), {.word = figure.word});
  };
  for (const Figure& figure : kFigures) {
    LiveWord sum{{}, figure.factor};
    for (const std::string& disk : disks) {
      if (!figure.isInTotals || isMultipathHead(discovery, disk)) continue;
      if (const auto slot = slotOf(disk, figure)) sum.slots.push_back(*slot);
    }
    if (!sum.slots.empty())
      discovery.addSimple("totals", {}, dotted({"disk", figure.name}), figure.unit, std::move(sum));
  }
  for (const std::string& disk : disks) {
    const std::string name = liveName(disk);
    for (const Figure& figure : kFigures) {
      if (const auto slot = slotOf(disk, figure))
        discovery.addSimple("disks", name, dotted({"disk", name, figure.name}), figure.unit,
                            {{*slot}, figure.factor}, "stat");
    }
  }
}

}  // namespace tbdaily
