// One pass over the statistics buffer, in place.

#include <algorithm>
#include <array>
#include <type_traits>
#include <variant>

#include "storage/stats_context.h"
#include "storage/stats_table.h"

namespace tbdaily {

namespace {

constexpr std::uint32_t kLargestIdentifier = 0x30000000;
constexpr std::uint32_t kUnknownDriverVersion = 0xFFFFFFFF;
constexpr std::uint32_t kReadCountHisto = 265;

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

void storeField(StatsContext& context, const FieldRow& row, std::uint64_t value) {
  std::visit(
      [&](auto member) {
        auto& field = context.*member;
        field = static_cast<std::remove_reference_t<decltype(field)>>(value);
      },
      row.field);
}

// The fixed fields of a record whose first values, at least one, are taken; they start at word `first`.
void RecordStat(StatsContext& context, std::uint16_t row, const StatWords& words, std::size_t first,
                std::uint16_t count) {
  if (kFieldOfRow[row] != kNoField) storeField(context, kFields[kFieldOfRow[row]], words[first]);
  if (kStats[row].id != kReadCountHisto) return;
  for (std::size_t i = 0; i < count; ++i) context.readCountHisto[i] = words[first + i];
}

// Asks the memory for what is read next. Values are jumped over, so the processor does not see by itself
// which words those are.
class ReadAhead {
 public:
  explicit ReadAhead(const StatWords& words) : words_(words) {}
  void beyond(std::size_t at) {
    for (; asked_ < at + kDistance; asked_ += kWordsOfLine) words_.prefetch(asked_);
  }

 private:
  static constexpr std::size_t kWordsOfLine = 8;  // of a cache's memory
  static constexpr std::size_t kDistance = 512;   // in words

  const StatWords& words_;
  std::size_t asked_ = 0;  // the words before this one
};

}  // namespace

bool STXParseBufferToCxt(StatsContext& context, std::span<const std::byte> buffer) {
  context.driverVersion = kUnknownDriverVersion;
  const StatWords words(buffer.first(static_cast<std::uint32_t>(buffer.size())));
  ReadAhead ahead(words);
  std::size_t at = 0, listed = 0;
  bool isCorrupt = false;
  while (at < words.size()) {
    const StatRecordHeader header = words.headerAt(at);
    ahead.beyond(at);
    isCorrupt = header.id > kLargestIdentifier || header.values >= words.size() - at;
    if (isCorrupt) {
      context.exportVersion = 0;
      break;
    }
    if (const auto row = findStat(header.id)) {
      const std::uint16_t count = takenValues(*row, header.values);
      if (count > 0) RecordStat(context, *row, words, at + 1, count);
      listed += count;
    }
    at += 1 + std::size_t{header.values};
  }
  context.nodes = StatNodes(words.first(at), listed);
  return words.size() > 0 && !isCorrupt;
}

void STXReleaseContext(StatsContext& context) {
  context = StatsContext();
}

}  // namespace tbdaily
