#include "drivermetrics/sample_buffer.h"

#include <algorithm>
#include <bit>

#include "platform/keyed_hash.h"

namespace kdreport {

namespace {

std::uint32_t hashOf(const std::pair<std::uint64_t, std::uint64_t>& identifiers) {
  return tbdaily::KeyedHash::of(identifiers.first, identifiers.second);
}

}  // namespace

SampleBuffer::SampleBuffer(std::span<const std::byte> buffer)
    : buffer_(buffer.first(std::min(buffer.size() / kElementSize, kNone) * kElementSize)) {}

std::size_t SampleBuffer::endAt(std::size_t element) {
  if (element < elements()) {
    end_ = End::NoLength;
  } else {
    end_ = element == elements() ? End::Exact : End::Overrun;
  }
  return kNone;
}

std::size_t SampleBuffer::search(const Identifiers& wanted) {
  if (slots_.empty()) makeTable();
  const std::uint32_t known = slotOf(wanted, hashOf(wanted));
  if (known != kFree) return known & elementBits_;
  for (std::size_t element = step(); element != kNone; element = step()) {
    const Identifiers met = identifiersAt(element);
    note(met, element);
    if (met == wanted) return element;
  }
  return kNone;
}

void SampleBuffer::makeTable() {
  slots_.resize(std::bit_ceil(2 * elements() + 1), kFree);
  elementBits_ = static_cast<std::uint32_t>(std::bit_ceil(elements() + 1) - 1);
  const std::size_t passed = std::exchange(next_, 0);
  while (next_ < passed) {
    const std::size_t element = step();
    if (element == kNone) break;
    note(identifiersAt(element), element);
  }
}

void SampleBuffer::note(const Identifiers& met, std::size_t element) {
  const std::uint32_t hash = hashOf(met);
  std::uint32_t& slot = slotOf(met, hash);
  if (slot == kFree) slot = static_cast<std::uint32_t>(element) | (hash & ~elementBits_);
}

std::uint32_t& SampleBuffer::slotOf(const Identifiers& wanted, std::uint32_t hash) {
  const auto holds = [&](std::uint32_t slot) {
    return ((slot ^ hash) & ~elementBits_) == 0 && identifiersAt(slot & elementBits_) == wanted;
  };
  const std::size_t last = slots_.size() - 1;
  std::size_t slot = hash & last;
  while (slots_[slot] != kFree && !holds(slots_[slot])) slot = (slot + 1) & last;
  return slots_[slot];
}

}  // namespace kdreport
