// Swapping, faults and errors of the memory.
#include <unistd.h>

#include <array>

#include "platform/linux/live/live_drivers.h"

namespace tbdaily {

namespace {

// A line of /proc/vmstat, or of /proc/meminfo in KiB.
struct Figure {
  std::string_view name;
  const char* file;
  const char* line;
  LiveUnit unit;
  enum Factor : std::uint8_t { One, Page, Kibibyte } factor;
};
constexpr std::array<Figure, 5> kFigures{{
    {"memory.swappedIn", "/proc/vmstat", "pswpin", LiveUnit::Bytes, Figure::Page},
    {"memory.swappedOut", "/proc/vmstat", "pswpout", LiveUnit::Bytes, Figure::Page},
    {"memory.available", "/proc/meminfo", "MemAvailable:", LiveUnit::Bytes, Figure::Kibibyte},
    {"memory.majorFaults", "/proc/vmstat", "pgmajfault", LiveUnit::Events, Figure::One},
    {"memory.outOfMemoryKills", "/proc/vmstat", "oom_kill", LiveUnit::Events, Figure::One},
}};

std::int64_t valueOf(Figure::Factor factor) {
  if (factor == Figure::Page) return ::sysconf(_SC_PAGESIZE);
  return factor == Figure::Kibibyte ? 1024 : 1;
}

void addErrors(LiveDiscovery& discovery, const char* file, std::string name) {
  constexpr std::string_view kControllers = "/sys/devices/system/edac/mc";
  LiveWord sum;
  for (const std::string& controller : discovery.numbered(kControllers, "mc")) {
    const auto count = discovery.number(pathOf({kControllers, controller, file}));
    if (count) sum.slots.push_back(*count);
  }
  if (!sum.slots.empty()) discovery.addSimple("ecc", {}, std::move(name), LiveUnit::Events, std::move(sum));
}

}  // namespace

void discoverMemory(LiveDiscovery& discovery) {
  for (const Figure& figure : kFigures) {
    const auto number = discovery.cell(figure.file, {.line = figure.line});
    if (number)
      discovery.addSimple("memory", {}, std::string(figure.name), figure.unit,
                          {{*number}, valueOf(figure.factor)});
  }
  addErrors(discovery, "ce_count", "memory.corrected");
  addErrors(discovery, "ue_count", "memory.uncorrected");
}

}  // namespace tbdaily
