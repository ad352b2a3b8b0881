// The band-statistics and defects lists of a controller.

#include <algorithm>
#include <array>
#include <string>

#include "platform/byte_reader.h"
#include "platform/log_submission.h"
#include "storage/nand_info.h"
#include "storage/nand_log_writer.h"
#include "storage/structured_logs.h"

namespace tbdaily {

namespace {

constexpr std::size_t kWord = 4;
constexpr std::size_t kValidityHeader = 8;
constexpr std::size_t kValiditySkippedWord = 8;
constexpr std::size_t kValidityEntry = 20;
constexpr std::uint32_t kValidityLists = 16;

constexpr std::size_t kDefectsHeader = 12;
constexpr std::size_t kDefectEntry = 32;

// The entries of the records that the job reads as 32-bit numbers.
std::uint32_t wordAt(std::span<const std::byte> bytes, std::size_t offset) {
  return ByteReader(bytes).at<std::uint32_t>(offset).value_or(0);
}

PlistNumber number32(std::uint32_t value) {
  return PlistNumber::int32(static_cast<std::int32_t>(value));
}

// How many entries of a size lie wholly inside, from an offset on; at most `count`.
std::size_t wholeEntries(std::span<const std::byte> bytes, std::size_t offset, std::size_t entrySize,
                         std::uint32_t count) {
  const std::size_t room = bytes.size() > offset ? (bytes.size() - offset) / entrySize : 0;
  return std::min<std::size_t>(room, count);
}

// Adds the values of each list, in entry order, under "ValidityList[k]".
void addValidityLists(std::span<const std::byte> bytes, std::size_t offset, std::uint32_t count,
                      PlistDictionary& target) {
  std::array<PlistArray, kValidityLists> lists;
  const std::size_t entries = wholeEntries(bytes, offset, kValidityEntry, count);
  for (std::size_t i = 0; i < entries; ++i) {
    const std::size_t entry = offset + i * kValidityEntry;
    const std::uint32_t list = wordAt(bytes, entry + kWord);
    if (list < kValidityLists) lists[list].emplace_back(number32(wordAt(bytes, entry + 2 * kWord)));
  }
  for (std::size_t k = 0; k < lists.size(); ++k) {
    if (lists[k].empty()) continue;
    std::string key("ValidityList[");
    key.append(std::to_string(k)).append("]");
    target.set(key, PlistValue::array(std::move(lists[k])));
  }
}

// The reason as it is logged: controllers of other classes than the first one say how the defect was found.
std::uint32_t reasonOf(std::uint32_t reason, std::uint32_t defectMode, std::string_view className,
                       Diagnostics& diagnostics) {
  if (className == "STXStorage" || defectMode == 0) return reason;
  if (defectMode == 1) return reason + 200;
  if (defectMode == 2) return reason + 100;
  diagnostics.error("Encountered unexpected defectMode: 0x%x", defectMode);
  return reason;
}

PlistDictionary defectRecord(std::span<const std::byte> entry, std::string_view className,
                             Diagnostics& diagnostics) {
  const auto word = [entry](std::size_t i) { return wordAt(entry, i * kWord); };
  const auto temperature = static_cast<std::int8_t>(word(6) & 0xFF);
  const std::pair<std::string_view, PlistNumber> fields[] = {
      {"Bus", number32(word(0) & 0xFFFF)},
      {"CE", number32(word(0) >> 16)},
      {"CAU", number32(word(1))},
      {"Block", number32(word(2))},
      {"Cycle", number32(word(3))},
      {"Reason", number32(reasonOf(word(4), word(7), className, diagnostics))},
      {"Page", number32(word(5))},
      {"Temperature", PlistNumber::int8(temperature)},
  };
  PlistDictionary record;
  for (const auto& [key, value] : fields) SetNumberValue(record, key, value, diagnostics);
  return record;
}

}  // namespace

bool HandleValidityList(Platform& platform, const FetchedList& list) {
  Diagnostics& diagnostics = platform.diagnostics;
  if (!gStorageLogState.gNeedValidityList) return true;
  const std::uint32_t count = wordAt(list.filled, 0);
  const std::uint32_t skipped = wordAt(list.filled, kWord);
  const std::uint64_t needed =
      kValidityHeader + kValiditySkippedWord * std::uint64_t{skipped} + kValidityEntry * std::uint64_t{count};
  if (count == 0 || needed > list.size) {
    diagnostics.error("data cannot be parsed");
    return false;
  }
  PlistDictionary values;
  SetNumberValue(values, "IntermediateWamp", PlistNumber::float64(gStorageLogState.gCurrentSysWamp),
                 diagnostics);
  SetNumberValue(values, "UserWamp", PlistNumber::float64(gStorageLogState.gCurrentUserWamp), diagnostics);
  DumpNANDInfo(platform, values);
  addValidityLists(list.filled, kValidityHeader + kValiditySkippedWord * std::size_t{skipped}, count, values);
  NLW_WriteLog(platform, "165", &values);
  return true;
}

bool HandleDefectsList(Platform& platform, const FetchedList& list) {
  Diagnostics& diagnostics = platform.diagnostics;
  PlistDictionary summary;
  SetNumberValue(summary, "Factory Count", number32(wordAt(list.filled, kWord)), diagnostics);
  if (const auto number = list.characteristics.get("nand-device-desc").asNumber()) {
    SetNumberValue(summary, "com.velmora.NANDInfo.nandDesc",
                   PlistNumber::int32(static_cast<std::int32_t>(number->toInt64())), diagnostics);
  }
  platform.logSubmission.logStructuredData(kStorageLogType, summary);

  const std::uint32_t count = wordAt(list.filled, 2 * kWord);
  const std::size_t entries = wholeEntries(list.filled, kDefectsHeader, kDefectEntry, count);
  for (std::size_t i = 0; i < entries; ++i) {
    const auto entry = list.filled.subspan(kDefectsHeader + i * kDefectEntry, kDefectEntry);
    platform.logSubmission.logStructuredData(kStorageLogType,
                                             defectRecord(entry, list.className, diagnostics));
  }
  return true;
}

}  // namespace tbdaily
