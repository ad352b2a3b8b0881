// The command codes of the storage driver's buffers: part of its wire protocol.
#pragma once

#include <cstdint>

namespace tbdaily {

// The two are equal in every table here; they are read apart all the same.
struct STXSelectorPair {
  std::uint32_t sizeQuery = 0;  // element 0: asks how many bytes the buffer holds
  std::uint32_t dataFetch = 0;  // element 1: copies the buffer out
};

// A size-query code that means: the controller does not serve this buffer.
inline constexpr std::uint32_t kNoSelector = 0xFFFFFFFF;

// Each getter returns the same table on every call; never null here, valid for the life of the process.
using SelectorGetter = const STXSelectorPair* (*)();

const STXSelectorPair* STXGetStatsSelectors();           // statistics
const STXSelectorPair* STXGetDefectsListSelectors();     // defects list
const STXSelectorPair* STXGetTelemetryListSelectors();   // telemetry: the same codes for sub-lists 0, 1 and 2
const STXSelectorPair* STXGetTaskSchedulerSelectors();   // task scheduler state
const STXSelectorPair* STXGetSnapshotSelectors();        // snapshot records
const STXSelectorPair* STXGetSnapshotHeaderSelectors();  // the description of a snapshot record
const STXSelectorPair* STXGetBandStatsSelectors();       // band statistics, also called the validity list

}  // namespace tbdaily
