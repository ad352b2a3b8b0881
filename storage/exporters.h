// The kinds of storage controllers that the job knows, and how each is asked.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>

#include "storage/selectors.h"
#include "storage/stats_context.h"

namespace tbdaily {

inline constexpr std::uint32_t kNoMethod = 0xFFFFFFFF;

struct NandExporter {
  std::string_view className;              // registry class; empty in the row that ends a table
  std::string_view characteristicsKey;     // registry property that holds the characteristics dictionary
  std::uint32_t recommendationMethod = 0;  // content-deletion query, or kNoMethod
  std::uint32_t sizeMethod = 0;            // carries size queries
  std::uint32_t dataMethod = 0;            // carries data fetches
  // A null getter: the controller cannot serve that buffer.
  SelectorGetter statsSelectors = nullptr;
  SelectorGetter defectsListSelectors = nullptr;
  SelectorGetter telemetryListSelectors = nullptr;
  SelectorGetter taskSchedulerSelectors = nullptr;
  SelectorGetter snapshotSelectors = nullptr;
  SelectorGetter snapshotHeaderSelectors = nullptr;
  SelectorGetter bandStatsSelectors = nullptr;
  std::array<SelectorGetter, 2> reserved{};
  bool (*parseBufferToCxt)(StatsContext& context, std::span<const std::byte> buffer) = nullptr;
  void (*releaseContext)(StatsContext& context) = nullptr;
};

// Searched in this order; the last row is empty and ends the table.
inline constexpr std::array<NandExporter, 3> nand_exporters = {{
    {"STXStorage",
     "Device Characteristics",
     5,
     8,
     8,
     STXGetStatsSelectors,
     STXGetDefectsListSelectors,
     STXGetTelemetryListSelectors,
     STXGetTaskSchedulerSelectors,
     STXGetSnapshotSelectors,
     STXGetSnapshotHeaderSelectors,
     STXGetBandStatsSelectors,
     {},
     STXParseBufferToCxt,
     STXReleaseContext},
    {"VelmoraEmbeddedNVMeController",
     "Controller Characteristics",
     kNoMethod,
     9,
     9,
     STXGetStatsSelectors,
     STXGetDefectsListSelectors,
     STXGetTelemetryListSelectors,
     STXGetTaskSchedulerSelectors,
     STXGetSnapshotSelectors,
     STXGetSnapshotHeaderSelectors,
     STXGetBandStatsSelectors,
     {},
     STXParseBufferToCxt,
     STXReleaseContext},
    {},
}};

// A table of exporters that ends with an empty row. Callers other than tests take the default.
using NandExporterTable = std::span<const NandExporter>;

}  // namespace tbdaily
