// The storage controller's statistics buffer, decoded.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>

#include "storage/stats_nodes.h"
#include "storage/storage_buffer.h"

namespace tbdaily {

// A field whose statistic is absent from the buffer keeps its zero. Counts are the controller's own; sizes
// are in bytes, times in seconds.
struct StatsContext {
  std::uint32_t exportVersion = 0;  // 0 when the buffer was corrupt
  std::uint32_t driverVersion = 0;  // 0xFFFFFFFF once parsing started: no statistic fills it
  std::uint32_t numVirtualBlocks = 0;
  std::uint32_t blocksPerVirtualBlock = 0;
  std::uint32_t pagesPerVirtualBlock = 0;
  std::uint32_t bytesPerPage = 0;
  std::uint64_t hostReads = 0;
  std::uint64_t hostWrites = 0;
  std::uint64_t numFreeVirtualBlocks = 0;
  std::uint64_t wearLevMoves = 0;
  std::uint64_t nandReads = 0;
  std::uint64_t nandWrites = 0;
  std::uint64_t bandErases = 0;
  std::uint64_t IND_pool_free = 0;
  std::uint64_t IND_pool_count = 0;
  std::uint64_t utilFormatTime = 0;  // seconds since 1970-01-01 UTC
  std::uint64_t numSleepOps = 0;
  std::uint64_t maxHighEnduranceBlockErases = 0;
  std::array<std::uint64_t, 5> readCountHisto{};
  StatNodes nodes;       // every recognised value, in the order of the buffer, which they are read from
  StorageBuffer buffer;  // that buffer, when it was fetched for this context; else its owner keeps it
};

// Decodes the buffer into the context, which the caller provides zero-filled. The buffer is borrowed, not
// copied: it outlives the use of the context's nodes. The low 32 bits of the buffer's length count; bytes
// after its last whole word are ignored. True when every record was decoded. False for a buffer without a
// whole word, and, with exportVersion 0, for one with a corrupt header; what was decoded before it stays.
bool STXParseBufferToCxt(StatsContext& context, std::span<const std::byte> buffer);

// Zero-fills the context, and frees its buffer when it has one.
void STXReleaseContext(StatsContext& context);

}  // namespace tbdaily
