// The storage controller's statistics buffer, decoded.
//
// The buffer is a gapless sequence of records of little-endian 64-bit words: a header (bits 0 to 31 the
// statistic's identifier, bits 32 to 63 the number n of values) and n values.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace tbdaily {

// One listed value. Its name is that of a statistic, followed by the element's index in decimal when the
// record contributed more than one value; it is composed when asked for, since a buffer may list millions of
// values.
struct StatNode {
  static constexpr std::uint16_t kBareName = std::numeric_limits<std::uint16_t>::max();

  std::uint64_t value = 0;
  std::uint16_t row = 0;  // of kStats
  std::uint16_t element = kBareName;

  std::string name() const;
  bool isNamed(std::string_view name) const;  // without an allocation
  // The value in unsigned decimal.
  std::string text() const { return std::to_string(value); }
};

// A field whose statistic is absent from the buffer keeps its zero. Counts are the controller's own; sizes
// are in bytes, times in seconds. Owns the list; the destructor releases it as STXReleaseContext does.
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
  std::vector<StatNode> nodes;  // every recognised value, in the order of the buffer
};

// Decodes the buffer into the context, which the caller provides zero-filled. The low 32 bits of the buffer's
// length count; bytes after its last whole word are ignored. True when every record was decoded. False for a
// buffer without a whole word, and, with exportVersion 0, for one with a corrupt header; what was decoded
// before it stays. A value for which there is no memory is left out of the list.
bool STXParseBufferToCxt(StatsContext& context, std::span<const std::byte> buffer);

// Frees the list and zero-fills the context.
void STXReleaseContext(StatsContext& context);

}  // namespace tbdaily
