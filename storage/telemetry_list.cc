// The telemetry lists of a controller: a block of counters and a summary of each NAND channel.

#include <algorithm>
#include <array>
#include <memory>
#include <new>
#include <optional>
#include <string>

#include "platform/byte_reader.h"
#include "platform/log_submission.h"
#include "storage/nand_info.h"
#include "storage/structured_logs.h"
#include "storage/vendor_counters.h"

namespace tbdaily {

namespace {

constexpr std::size_t kSummarySize = 32;
constexpr std::size_t kLongestChipId = 63;  // with its end it takes 64 bytes

// The words of a channel's summary, in order; the last one is not read.
constexpr std::array<std::string_view, 7> kSummaryFields = {"RD",  "PE",         "Max_PE_rate", "t0",
                                                            "Ret", "block_type", "num_pages"};

// What the characteristics dictionary says of the list.
struct TelemetryLayout {
  ControllerKind kind = ControllerKind::VendorLayouts;
  std::uint64_t vendorKey = 0;
  std::uint32_t channels = 0;
};

std::optional<std::string_view> chipIdOf(const PlistDictionary& characteristics, Diagnostics& diagnostics) {
  const PlistValue* value = characteristics.find("chip-id");
  if (value == nullptr) {
    diagnostics.error("ERROR: Could not determine the %s\n", "chip-id");
    return std::nullopt;
  }
  const auto text = value->asString();
  if (!text) {
    diagnostics.error("ERROR: %s is not stored as a PVStringTypeID\n", "chip-id");
  } else if (text->size() > kLongestChipId) {
    diagnostics.error(
        "ERROR: Unable to obtain %s as conversion from the UniChar contents of PVString failed, or the "
        "buffer of %d bytes is "
        "too small\n",
        "chip-id", 64);
    return std::nullopt;
  }
  return text;
}

std::optional<std::string_view> manufacturerIdOf(const PlistDictionary& characteristics,
                                                 Diagnostics& diagnostics) {
  const PlistValue* value = characteristics.find("manufacturer-id");
  if (value == nullptr) {
    diagnostics.error("ERROR: Could not determine the %s\n", "manufacturer-id");
    return std::nullopt;
  }
  const auto text = value->asString();
  if (!text) diagnostics.error("ERROR: %s is NULL\n", "manufacturer-id");
  return text;
}

std::optional<TelemetryLayout> layoutOf(const PlistValue& characteristics, Diagnostics& diagnostics) {
  const PlistDictionary* dictionary = characteristics.asDictionary();
  if (dictionary == nullptr) {
    diagnostics.error("ERROR: Could not parse the Device Characteristics dictionary\n");
    return std::nullopt;
  }
  const auto chipId = chipIdOf(*dictionary, diagnostics);
  if (!chipId) return std::nullopt;
  const auto manufacturerId = manufacturerIdOf(*dictionary, diagnostics);
  if (!manufacturerId) return std::nullopt;
  const std::uint64_t vendorKey = nandVendorKey(*manufacturerId, diagnostics);
  const PlistValue buses = dictionary->get("num-bus");
  if (!buses.asNumber()) {
    diagnostics.error("ERROR: could not determine the number of channels\n");
    return std::nullopt;
  }
  // A signed 32-bit number that is used as an unsigned one: a negative count runs into the bounds.
  const auto channels = static_cast<std::uint32_t>(buses.asNumber()->toInt64());
  return TelemetryLayout{controllerKind(*chipId), vendorKey, channels};
}

PlistNumber number32(std::uint32_t value) {
  return PlistNumber::int32(static_cast<std::int32_t>(value));
}

// Words that are not there are 0.
void addSummary(std::span<const std::byte> summary, PlistDictionary& log, Diagnostics& diagnostics) {
  const ByteReader reader(summary);
  for (std::size_t i = 0; i < kSummaryFields.size(); ++i) {
    SetNumberValue(log, kSummaryFields[i], number32(reader.at<std::uint32_t>(4 * i).value_or(0)),
                   diagnostics);
  }
}

void addCounters(const NandCounterRecord& record, ControllerKind kind, PlistDictionary& log,
                 Diagnostics& diagnostics) {
  std::string key;
  for (const NandCounterArray& array : nandCounterArrays) {
    const auto values = record.reported(array, kind);
    for (std::size_t i = 0; i < values.size(); ++i) {
      key.assign(array.name).append("[").append(std::to_string(i)).append("]");
      SetNumberValue(log, key, number32(values[i]), diagnostics);
    }
  }
}

// At most `size` bytes; those that are filled.
std::span<const std::byte> filledPart(std::span<const std::byte> filled, std::size_t offset,
                                      std::size_t size) {
  const auto rest = filled.subspan(std::min(offset, filled.size()));
  return rest.first(std::min(size, rest.size()));
}

}  // namespace

bool HandleTelemetryList(Platform& platform, const FetchedList& list) {
  Diagnostics& diagnostics = platform.diagnostics;
  const std::unique_ptr<NandCounterRecord> record(new (std::nothrow) NandCounterRecord);
  if (record == nullptr) {
    diagnostics.error("ERROR: Could not malloc %lu bytes\n",
                      static_cast<unsigned long>(sizeof(NandCounterRecord)));
    return false;
  }
  const auto layout = layoutOf(list.characteristics, diagnostics);
  if (!layout) return false;
  if (std::uint64_t{layout->channels} * (kNandCounterBlockSize + kSummarySize) > list.size) {
    diagnostics.error("ERROR: Attempting to parse beyond the bounds of the buffer\n");
    return false;
  }
  const NandCounterParser parse = nandCounterParser(layout->kind, layout->vendorKey);
  const std::size_t summaries = std::size_t{layout->channels} * kNandCounterBlockSize;
  // More channels than there are counters for are announced, not measured.
  const std::size_t channels =
      std::min<std::size_t>(layout->channels, list.filled.size() / kNandCounterBlockSize);
  for (std::size_t channel = 0; channel < channels; ++channel) {
    *record = {};
    parse(list.filled.subspan(channel * kNandCounterBlockSize).first<kNandCounterBlockSize>(), *record);
    PlistDictionary log;
    addSummary(filledPart(list.filled, summaries + channel * kSummarySize, kSummarySize), log, diagnostics);
    addCounters(*record, layout->kind, log, diagnostics);
    platform.logSubmission.logStructuredData(kStorageLogType, log);
  }
  return true;
}

}  // namespace tbdaily
