// The storage statistics of a day as structured data logs and the NAND text log.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>

#include "platform/diagnostics.h"
#include "platform/platform.h"
#include "platform/plist_value.h"
#include "storage/exporters.h"

namespace tbdaily {

inline constexpr int kStorageLogType = 176;

// Process-wide, for the main thread; rewritten by every DumpStorageStructuredLog before it fetches a list.
// Tests put a fresh one in its place.
struct StorageLogState {
  bool gForceCollectionSet = false;  // forces the validity list to be logged; nothing in the job sets it
  bool gNeedValidityList = false;    // the validity list is to be logged on this run
  double gCurrentUserWamp = 0;       // write amplification of this run
  double gCurrentSysWamp = 0;
};
extern StorageLogState gStorageLogState;

// Computes the write amplification, then fetches the band statistics, three telemetry lists and the defects
// list and hands each to its handler. True when every list that was fetched was handled. `extended` sets a
// flag of each request whose meaning is the controller's. Troubles are told through the platform's
// diagnostics.
bool DumpStorageStructuredLog(Platform& platform, bool extended);

// One list as it was fetched.
struct FetchedList {
  std::span<const std::byte> filled;  // may end before the size that was announced
  std::size_t size = 0;               // announced by the size query
  PlistValue characteristics;         // the controller's characteristics dictionary
  std::string_view className;         // of the controller
};

// Each answers whether the list could be handled.
// Band statistics: the NAND text log with the validity lists and the NAND info, when gNeedValidityList says
// so.
bool HandleValidityList(Platform& platform, const FetchedList& list);
// One record of each NAND channel whose counters were filled; of its summary, what was not filled is 0.
bool HandleTelemetryList(Platform& platform, const FetchedList& list);
// One record with the factory count, and one of each defect.
bool HandleDefectsList(Platform& platform, const FetchedList& list);

}  // namespace tbdaily
