#include "platform/plist/base64.h"

#include <array>
#include <cstdint>

namespace tbdaily {

namespace {

constexpr std::string_view kAlphabet = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

constexpr std::uint8_t kSpace = 64, kPadding = 65, kOther = 66;

// For each character its six bits, or one of the classes above.
constexpr auto kSextets = [] {
  std::array<std::uint8_t, 256> table{};
  table.fill(kOther);
  for (std::size_t i = 0; i < kAlphabet.size(); ++i) {
    table[static_cast<unsigned char>(kAlphabet[i])] = static_cast<std::uint8_t>(i);
  }
  for (const char space : {' ', '\t', '\n', '\r'}) table[static_cast<unsigned char>(space)] = kSpace;
  table['='] = kPadding;
  return table;
}();

}  // namespace

void appendBase64(std::string& out, std::span<const std::byte> bytes) {
  const std::size_t start = out.size();
  out.resize(start + (bytes.size() + 2) / 3 * 4, '=');
  char* to = out.data() + start;
  const auto put = [&to](std::uint32_t group, unsigned shift) { *to++ = kAlphabet[group >> shift & 63U]; };
  const auto byte = [bytes](std::size_t i) { return std::to_integer<std::uint32_t>(bytes[i]); };
  std::size_t at = 0;
  for (; bytes.size() - at >= 3; at += 3) {
    const std::uint32_t group = byte(at) << 16 | byte(at + 1) << 8 | byte(at + 2);
    put(group, 18);
    put(group, 12);
    put(group, 6);
    put(group, 0);
  }
  if (at == bytes.size()) return;
  const bool two = bytes.size() - at == 2;
  const std::uint32_t group = byte(at) << 16 | (two ? byte(at + 1) << 8 : 0U);
  put(group, 18);
  put(group, 12);
  if (two) put(group, 6);
}

std::optional<PlistData> bytesOfBase64(std::string_view text) {
  PlistData bytes;
  bytes.reserve(text.size() / 4 * 3);
  std::uint32_t group = 0;  // the bits of the sextets since the last whole group of four characters
  unsigned sextets = 0, padding = 0;
  for (const char c : text) {
    const std::uint8_t sextet = kSextets[static_cast<unsigned char>(c)];
    if (sextet == kSpace) continue;
    if (sextet == kPadding) {
      ++padding;
      continue;
    }
    if (sextet == kOther || padding != 0) return std::nullopt;
    group = group << 6 | sextet;
    if (++sextets < 4) continue;
    for (const unsigned shift : {16U, 8U, 0U}) bytes.push_back(static_cast<std::byte>(group >> shift & 255U));
    group = sextets = 0;
  }
  if (sextets == 0 && padding == 0) return bytes;
  if (sextets < 2 || sextets + padding != 4) return std::nullopt;
  group <<= 6 * padding;
  bytes.push_back(static_cast<std::byte>(group >> 16 & 255U));
  if (sextets == 3) bytes.push_back(static_cast<std::byte>(group >> 8 & 255U));
  return bytes;
}

}  // namespace tbdaily
