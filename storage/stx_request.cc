#include "storage/stx_request.h"

#include <span>

#include "platform/byte_writer.h"

namespace tbdaily {

namespace {

constexpr unsigned kSizeQuery = 1;
constexpr unsigned kExtended = 2;
constexpr unsigned kListShift = 2;
constexpr unsigned kListMask = 0xFF;

unsigned flagsOf(const StxRequestOptions& options) {
  return (options.extended ? kExtended : 0U) | (options.list & kListMask) << kListShift;
}

}  // namespace

StxRequest StxRequest::sizeQuery(const STXSelectorPair& selectors, const StxRequestOptions& options) {
  return {selectors.sizeQuery, static_cast<std::uint16_t>(kSizeQuery | flagsOf(options))};
}

StxRequest StxRequest::dataFetch(const STXSelectorPair& selectors, const StxRequestOptions& options) {
  return {selectors.dataFetch, static_cast<std::uint16_t>(flagsOf(options))};
}

std::array<std::byte, 24> StxRequest::bytes() const {
  std::array<std::byte, 24> bytes{};
  writeLittleEndian(std::span(bytes).first(sizeof(command)), command);
  writeLittleEndian(std::span(bytes).subspan(sizeof(command), sizeof(flags)), flags);
  return bytes;
}

}  // namespace tbdaily
