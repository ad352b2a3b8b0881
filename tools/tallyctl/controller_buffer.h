// Raw buffers of the storage controller, by the names that the companion gives them.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "platform/diagnostics.h"
#include "platform/driver_registry.h"
#include "storage/exporters.h"
#include "tools/tallyctl/outcome.h"

namespace tbdaily {

struct BufferKind {
  std::string_view name;
  SelectorGetter NandExporter::*selectors;
};

inline constexpr BufferKind kBufferKinds[] = {
    {"stats", &NandExporter::statsSelectors},
    {"band-stats", &NandExporter::bandStatsSelectors},
    {"telemetry", &NandExporter::telemetryListSelectors},
    {"defects", &NandExporter::defectsListSelectors},
    {"task-scheduler", &NandExporter::taskSchedulerSelectors},
    {"snapshot", &NandExporter::snapshotSelectors},
    {"snapshot-header", &NandExporter::snapshotHeaderSelectors},
};

// The companion says what went wrong in one line of its own; the storage modules' texts are for the job.
class QuietDiagnostics : public Diagnostics {
  void writeError(std::string_view) override {}
  void writeOutput(std::string_view) override {}
};

// Asks the controller for its size and fetches it. `kind` is one of kBufferKinds' names.
Outcome<std::vector<std::byte>> fetchControllerBuffer(DriverRegistry& registry, std::string_view kind,
                                                      std::uint16_t list = 0);

}  // namespace tbdaily
