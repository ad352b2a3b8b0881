// How long tasks waited for a resource.
#include <array>

#include "platform/linux/live/live_drivers.h"

namespace tbdaily {

void discoverPressure(LiveDiscovery& discovery) {
  for (const std::string resource : {"cpu", "memory", "io"}) {
    for (const std::string share : {"some", "full"}) {
      const auto total =
          discovery.cell(pathOf({"/proc/pressure", resource}), {.line = share, .label = "total="});
      if (total)
        discovery.addSimple("pressure", resource, dotted({"pressure", resource, share}),
                            LiveUnit::Microseconds, {{*total}});
    }
  }
}

}  // namespace tbdaily
