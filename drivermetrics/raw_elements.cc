#include "drivermetrics/raw_elements.h"

#include <algorithm>

#include "drivermetrics/object_blocks.h"
#include "platform/byte_reader.h"
#include "platform/byte_writer.h"

namespace kdreport {

namespace {

void write64(std::span<std::byte> bytes, std::size_t offset, std::uint64_t value) {
  tbdaily::writeLittleEndian(bytes.subspan(offset, sizeof value), value);
}

std::uint64_t read64(std::span<const std::byte> bytes, std::size_t offset) {
  return tbdaily::ByteReader(bytes).at<std::uint64_t>(offset).value_or(0);
}

std::size_t wordOffset(std::size_t element, std::size_t word) {
  return element * kElementSize + element_offset::kWords + word * sizeof(std::uint64_t);
}

}  // namespace

std::uint64_t RawElements::stamp(std::size_t element) const {
  return read64(bytes_, element * kElementSize + element_offset::kStamp);
}

std::int64_t RawElements::word(std::size_t element, std::size_t word) const {
  return static_cast<std::int64_t>(read64(bytes_, wordOffset(element, word)));
}

std::int64_t RawElements::channelID() const {
  return static_cast<std::int64_t>(read64(bytes_, element_offset::kChannel));
}

void RawElements::setWord(std::size_t element, std::size_t word, std::int64_t value) {
  if (element < count_) write64(bytes_, wordOffset(element, word), static_cast<std::uint64_t>(value));
}

bool RawElements::copyFrom(const RawElements& other) {
  if (count_ != other.count_) return false;
  std::ranges::copy(other.bytes_.first(other.count_ * kElementSize), bytes_.begin());
  return true;
}

std::optional<RawElements> getRawElements(const ChannelRecord* channel, std::uint8_t format) {
  if (channel == nullptr) return std::nullopt;
  const std::span<std::byte> bytes = channel->elements();
  if (bytes.size() < kElementSize ||
      tbdaily::ByteReader(bytes).at<std::uint8_t>(element_offset::kType) != format)
    return std::nullopt;
  return RawElements(bytes, static_cast<std::uint16_t>(bytes.size() / kElementSize));
}

KdStatus cloneElements(ChannelRecord& destination, const ChannelRecord& source, ElementValues values,
                       ElementBlocks* memory) {
  if (!source.hasElements()) return kKdError;
  const auto bytes = source.elements();
  if (memory != nullptr) {
    memory->copy(bytes, destination);
  } else {
    destination.copyElements(bytes);
  }
  if (values == ElementValues::Keep) return kKdSuccess;
  auto elements = getRawElements(&destination, destination.format());
  if (!elements) return kKdError;
  for (std::size_t element = 0; element < elements->count(); ++element) {
    for (std::size_t word = 0; word < kElementWords; ++word)
      elements->setWord(element, word, kKdReportInvalid);
  }
  return kKdSuccess;
}

}  // namespace kdreport
