// One pass over the statistics buffer, in place.

#include <algorithm>
#include <new>
#include <type_traits>
#include <variant>

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

// The fields that hold the first value of one statistic each; narrow ones hold its low 32 bits.
struct FieldRow {
  std::uint32_t id;
  std::variant<std::uint64_t StatsContext::*, std::uint32_t StatsContext::*> field;
};
constexpr std::array<FieldRow, 17> kFields = {{
    {4, &StatsContext::hostWrites},
    {7, &StatsContext::hostReads},
    {12, &StatsContext::IND_pool_free},
    {13, &StatsContext::IND_pool_count},
    {17, &StatsContext::wearLevMoves},
    {18, &StatsContext::nandWrites},
    {19, &StatsContext::nandReads},
    {20, &StatsContext::bandErases},
    {28, &StatsContext::numSleepOps},
    {45, &StatsContext::maxHighEnduranceBlockErases},
    {48, &StatsContext::numFreeVirtualBlocks},
    {49, &StatsContext::bytesPerPage},
    {50, &StatsContext::pagesPerVirtualBlock},
    {51, &StatsContext::blocksPerVirtualBlock},
    {52, &StatsContext::numVirtualBlocks},
    {53, &StatsContext::exportVersion},
    {56, &StatsContext::utilFormatTime},
}};
constexpr std::size_t kNoField = kFields.size();

// Which field belongs to each row of kStats. Numbers, since the compiler confuses a null pointer to a member
// in a large constexpr table with one to the first member.
constexpr auto kFieldOfRow = [] {
  std::array<std::uint8_t, kStats.size()> fields{};
  fields.fill(kNoField);
  for (std::size_t i = 0; i < kFields.size(); ++i) {
    const auto stat = std::ranges::lower_bound(kStats, kFields[i].id, {}, &StatDefinition::id);
    fields[static_cast<std::size_t>(stat - kStats.begin())] = static_cast<std::uint8_t>(i);
  }
  return fields;
}();

void storeField(StatsContext& context, std::uint16_t row, std::uint64_t value) {
  if (kFieldOfRow[row] == kNoField) return;
  std::visit(
      [&](auto member) {
        auto& field = context.*member;
        field = static_cast<std::remove_reference_t<decltype(field)>>(value);
      },
      kFields[kFieldOfRow[row]].field);
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
  storeField(context, row, words[first]);
  const bool isReadCountHisto = kStats[row].id == kReadCountHisto;
  if (count == 1) AppendStatNode(context, {words[first], row, StatNode::kBareName});
  for (std::size_t i = 0; i < count; ++i) {
    const std::uint64_t value = words[first + i];
    if (isReadCountHisto) context.readCountHisto[i] = value;
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
