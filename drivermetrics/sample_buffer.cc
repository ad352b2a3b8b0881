#include "drivermetrics/sample_buffer.h"

#include <algorithm>
#include <bit>

namespace kdreport {

SampleBuffer::SampleBuffer(std::span<const std::byte> buffer)
    : buffer_(buffer.first(std::min(buffer.size() / kElementSize, kNone) * kElementSize)),
      slots_(std::bit_ceil(2 * elements() + 1), kFree),
      lastSlot_(slots_.size() - 1),
      elementBits_(static_cast<std::uint32_t>(std::bit_ceil(elements() + 1) - 1)) {}

std::size_t SampleBuffer::endAt(std::size_t element) {
  if (element < elements()) {
    end_ = End::NoLength;
  } else {
    end_ = element == elements() ? End::Exact : End::Overrun;
  }
  return kNone;
}

std::size_t SampleBuffer::searchFrom(std::size_t element, const Identifiers& wanted) {
  for (; element != kNone; element = step()) {
    const Identifiers met = identifiersAt(element);
    const Place place = placeOf(met);
    if (*place.slot == kFree) note(element, place);
    if (met == wanted) break;
  }
  return element;
}

}  // namespace kdreport
