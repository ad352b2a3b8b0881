// One pass over the statistics buffer, in place.

#include <algorithm>
#include <new>

#include "platform/byte_reader.h"
#include "storage/stats_context.h"
#include "storage/stats_table.h"

namespace tbdaily {

namespace {

constexpr std::size_t kWordSize = sizeof(std::uint64_t);
constexpr std::uint32_t kLargestIdentifier = 0x30000000;
constexpr std::uint32_t kUnknownDriverVersion = 0xFFFFFFFF;
constexpr std::uint32_t kReadCountHisto = 265;

// The words of a buffer. Every index is checked against the word count before it is read.
class WordReader {
 public:
  explicit WordReader(std::span<const std::byte> buffer) : reader_(buffer) {}
  std::uint64_t operator[](std::size_t index) const {
    return reader_.at<std::uint64_t>(index * kWordSize).value_or(0);
  }

 private:
  ByteReader reader_;
};

// The fields that are read off one statistic each.
void storeField(StatsContext& context, std::uint32_t id, std::uint64_t value) {
  const auto low = static_cast<std::uint32_t>(value);
  switch (id) {
    case 4:
      context.hostWrites = value;
      break;
    case 7:
      context.hostReads = value;
      break;
    case 12:
      context.IND_pool_free = value;
      break;
    case 13:
      context.IND_pool_count = value;
      break;
    case 17:
      context.wearLevMoves = value;
      break;
    case 18:
      context.nandWrites = value;
      break;
    case 19:
      context.nandReads = value;
      break;
    case 20:
      context.bandErases = value;
      break;
    case 28:
      context.numSleepOps = value;
      break;
    case 45:
      context.maxHighEnduranceBlockErases = value;
      break;
    case 48:
      context.numFreeVirtualBlocks = value;
      break;
    case 49:
      context.bytesPerPage = low;
      break;
    case 50:
      context.pagesPerVirtualBlock = low;
      break;
    case 51:
      context.blocksPerVirtualBlock = low;
      break;
    case 52:
      context.numVirtualBlocks = low;
      break;
    case 53:
      context.exportVersion = low;
      break;
    case 56:
      context.utilFormatTime = value;
      break;
    default:
      break;
  }
}

void AppendStatNode(StatsContext& context, const StatNode& node) {
  try {
    context.nodes.push_back(node);
  } catch (const std::bad_alloc&) {
    // A value without memory is left out; the rest of the buffer still counts.
  }
}

// The first `count` values of a record, which start at word `first`.
void RecordStat(StatsContext& context, std::uint16_t row, const WordReader& words, std::size_t first,
                std::size_t count) {
  if (count == 0) return;
  const std::uint32_t id = kStats[row].id;
  storeField(context, id, words[first]);
  if (count == 1) AppendStatNode(context, {words[first], row, StatNode::kBareName});
  for (std::size_t i = 0; i < count; ++i) {
    const std::uint64_t value = words[first + i];
    if (id == kReadCountHisto) context.readCountHisto[i] = value;
    if (count > 1) AppendStatNode(context, {value, row, static_cast<std::uint16_t>(i)});
  }
}

}  // namespace

bool STXParseBufferToCxt(StatsContext& context, std::span<const std::byte> buffer) {
  context.driverVersion = kUnknownDriverVersion;
  const std::size_t end = static_cast<std::uint32_t>(buffer.size()) / kWordSize;
  const WordReader words(buffer);
  std::size_t at = 0;
  while (at < end) {
    const std::uint64_t header = words[at++];
    const auto id = static_cast<std::uint32_t>(header);
    const auto values = static_cast<std::uint32_t>(header >> 32);
    if (id > kLargestIdentifier || values > end - at) {
      context.exportVersion = 0;
      return false;
    }
    if (const auto row = findStat(id))
      RecordStat(context, *row, words, at, std::min<std::size_t>(values, kStats[*row].limit));
    at += values;
  }
  return end > 0;
}

}  // namespace tbdaily
