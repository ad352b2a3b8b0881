#include "platform/uuid.h"

#include <algorithm>

#include "platform/hexadecimal.h"

namespace tbdaily {

std::optional<UuidBytes> uuidOf(std::span<const std::byte> bytes) {
  UuidBytes uuid;
  if (bytes.size() != uuid.size()) return std::nullopt;
  std::ranges::copy(bytes, uuid.begin());
  return uuid;
}

std::string uuidText(const UuidBytes& uuid) {
  std::string text;
  text.reserve(36);
  for (std::size_t i = 0; i < uuid.size(); ++i) {
    if (i == 4 || i == 6 || i == 8 || i == 10) text += '-';
    appendHexadecimal(text, std::span(uuid).subspan(i, 1), HexadecimalCase::Upper);
  }
  return text;
}

}  // namespace tbdaily
