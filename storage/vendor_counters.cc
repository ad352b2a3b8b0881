#include "storage/vendor_counters.h"

#include <algorithm>

#include "platform/byte_reader.h"
#include "platform/hexadecimal.h"
#include "storage/vendor_counter_copies.h"

namespace tbdaily {

namespace {

constexpr std::size_t kWordSize = sizeof(std::uint32_t);
constexpr std::size_t kBlockWords = kNandCounterBlockSize / kWordSize;
constexpr std::size_t kRecordWords = NandCounterRecord().words.size();

// Vendor keys with a layout of their own.
constexpr std::uint64_t kSandiskKeyA = 0x4582603A5700;
constexpr std::uint64_t kSandiskKeyB = 0x458260DE5700;
constexpr std::uint64_t kHynixKey = 0xAD8252232100;
constexpr std::uint64_t kKeyMask = 0xFFFFFFFFFF00;  // the sixth byte does not decide

template <std::size_t N>
consteval bool staysInside(const std::array<CounterCopy, N>& copies) {
  return std::ranges::all_of(copies, [](const CounterCopy& copy) {
    return copy.to + copy.count <= kRecordWords && copy.from + copy.count <= kBlockWords;
  });
}

template <const auto& copies>
void copyCounters(NandCounterBlock block, NandCounterRecord& record) {
  static_assert(staysInside(copies));
  const ByteReader reader(block);
  for (const auto& [to, from, count] : copies) {
    for (std::size_t i = 0; i < count; ++i)
      record.words[to + i] = *reader.at<std::uint32_t>((from + i) * kWordSize);
  }
}

char lowerCase(char c) {
  return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

unsigned hexDigit(char c, Diagnostics& diagnostics) {
  const auto digit = hexadecimalDigit(c);
  if (!digit) diagnostics.output("unrecognized hex character: %c", lowerCase(c));
  return digit.value_or(0);
}

}  // namespace

ControllerKind controllerKind(std::string_view chipId) {
  if (chipId == "Q7A") return ControllerKind::Q7A;
  if (chipId == "Q8A") return ControllerKind::Q8A;
  return ControllerKind::VendorLayouts;
}

std::uint64_t nandVendorKey(std::string_view manufacturerId, Diagnostics& diagnostics) {
  constexpr std::size_t kVendorDigits = 4;
  const std::string_view vendor = manufacturerId.substr(0, kVendorDigits);
  const std::uint64_t high = hexStringToInt32(vendor, diagnostics) & 0xFFFF;
  const std::uint64_t low = hexStringToInt32(manufacturerId.substr(vendor.size()), diagnostics);
  return (high << 32 | low) & kKeyMask;
}

NandCounterParser nandCounterParser(ControllerKind kind, std::uint64_t vendorKey) {
  if (kind == ControllerKind::Q7A) return parseCountersAlgoGeneric;
  if (kind == ControllerKind::Q8A) return parseCountersAlgoGenericQ8;
  if (vendorKey == kSandiskKeyA || vendorKey == kSandiskKeyB) return parseCounters1xSandisk;
  if (vendorKey == kHynixKey) return parseCounters1xHynix;
  return parseCounters1y;
}

void parseCounters1y(NandCounterBlock block, NandCounterRecord& record) {
  copyCounters<k1yCopies>(block, record);
}
void parseCounters1xSandisk(NandCounterBlock block, NandCounterRecord& record) {
  copyCounters<k1xSandiskCopies>(block, record);
}
void parseCounters1xHynix(NandCounterBlock block, NandCounterRecord& record) {
  copyCounters<k1xHynixCopies>(block, record);
}
void parseCountersAlgoGeneric(NandCounterBlock block, NandCounterRecord& record) {
  parseOnlyAlgoGenericCounters(block, record);
}
void parseCountersAlgoGenericQ8(NandCounterBlock block, NandCounterRecord& record) {
  parseOnlyAlgoGenericCountersQ8(block, record);
}
void parseOnlyAlgoGenericCounters(NandCounterBlock block, NandCounterRecord& record) {
  copyCounters<kAlgoGenericCopies>(block, record);
}
void parseOnlyAlgoGenericCountersQ8(NandCounterBlock block, NandCounterRecord& record) {
  copyCounters<kAlgoGenericQ8Copies>(block, record);
}

std::uint8_t hexStringToByte(std::string_view text, Diagnostics& diagnostics) {
  unsigned value = 0;
  for (const char c : text.substr(0, 2)) value = value * 16 + hexDigit(c, diagnostics);
  return static_cast<std::uint8_t>(value);
}

std::uint32_t hexStringToInt32(std::string_view text, Diagnostics& diagnostics) {
  const std::string_view digits = text.substr(0, 8);
  std::uint32_t value = 0;
  for (std::size_t i = 0; i < digits.size(); i += 2)
    value = value << 8 | hexStringToByte(digits.substr(i), diagnostics);
  return value;
}

}  // namespace tbdaily
