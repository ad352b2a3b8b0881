// The raw counters that a telemetry list carries for each NAND channel: a block of 1024 little-endian 32-bit
// words whose layout depends on the controller and, for some controllers, on the NAND vendor. Every layout is
// copied word for word into one common record.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>

#include "platform/diagnostics.h"

namespace tbdaily {

inline constexpr std::size_t kNandCounterBlockSize = 4096;

using NandCounterBlock = std::span<const std::byte, kNandCounterBlockSize>;

// Which family of layouts a controller uses.
enum class ControllerKind : std::uint8_t { VendorLayouts = 0, Q7A = 1, Q8A = 2 };

// One named array of the record. `counts` is how many of its elements, from `first` on, the kinds of
// controllers fill, in the order of ControllerKind; 0 where the array is not for that kind.
struct NandCounterArray {
  std::string_view name;
  std::uint16_t first = 0;
  std::array<std::uint16_t, 3> counts{};
};

// In the order of the record. Word 64 belongs to none.
inline constexpr std::array<NandCounterArray, 11> nandCounterArrays = {{
    {"readStage", 0, {23, 23, 33}},
    {"initialReadStage", 33, {23, 23, 23}},
    {"nandStageOfLife", 56, {8, 8, 8}},
    {"dspExceptionParameter", 65, {12, 12, 38}},
    {"readStage18NumOfErrorsBin", 103, {12, 12, 12}},
    {"readStage9NumOfErrorsBin", 115, {10, 10, 10}},
    {"readStage10NumOfErrorsBin", 125, {10, 10, 10}},
    {"readStage17NumOfErrorsBin", 135, {10, 10, 10}},
    {"readStage19NumOfErrorsBin", 145, {12, 12, 12}},
    {"algoNANDAccessesBin", 157, {0, 8, 0}},
    {"retentionIndication", 165, {0, 0, 12}},
}};

struct NandCounterRecord {
  std::array<std::uint32_t, 177> words{};

  // The elements of the array that this kind of controller reports; empty when it reports none.
  std::span<const std::uint32_t> reported(const NandCounterArray& array, ControllerKind kind) const {
    return std::span(words).subspan(array.first, array.counts[static_cast<std::size_t>(kind)]);
  }
};

// From the controller's "chip-id" text.
ControllerKind controllerKind(std::string_view chipId);

// From the "manufacturer-id" text: its first five bytes in bits 8 to 47, the rest 0. Decides the layout for
// ControllerKind::VendorLayouts. Any text gives a key; characters that are no hexadecimal digits are told as
// by hexStringToByte.
std::uint64_t nandVendorKey(std::string_view manufacturerId, Diagnostics& diagnostics);

// Fills a record that the caller provides zero-filled; words that the layout lacks stay 0.
using NandCounterParser = void (*)(NandCounterBlock block, NandCounterRecord& record);

// Never null. The vendor key counts for ControllerKind::VendorLayouts only.
NandCounterParser nandCounterParser(ControllerKind kind, std::uint64_t vendorKey);

void parseCounters1y(NandCounterBlock block, NandCounterRecord& record);
void parseCounters1xSandisk(NandCounterBlock block, NandCounterRecord& record);
void parseCounters1xHynix(NandCounterBlock block, NandCounterRecord& record);
void parseCountersAlgoGeneric(NandCounterBlock block, NandCounterRecord& record);
void parseCountersAlgoGenericQ8(NandCounterBlock block, NandCounterRecord& record);
void parseOnlyAlgoGenericCounters(NandCounterBlock block, NandCounterRecord& record);
void parseOnlyAlgoGenericCountersQ8(NandCounterBlock block, NandCounterRecord& record);

// Reads at most two hexadecimal digits of either case. Each other character counts as the digit 0, and
// "unrecognized hex character: %c" (without a line end) goes to standard output.
std::uint8_t hexStringToByte(std::string_view text, Diagnostics& diagnostics);
// Reads at most eight, in pairs from the left; the last digit of an odd number of them is a byte of its own.
std::uint32_t hexStringToInt32(std::string_view text, Diagnostics& diagnostics);

}  // namespace tbdaily
