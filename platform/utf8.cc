#include "platform/utf8.h"

namespace tbdaily {

std::size_t utf8CharacterLength(std::string_view text) {
  if (text.empty()) return 0;
  const auto byte = [text](std::size_t i) {
    return i < text.size() ? static_cast<unsigned char>(text[i]) : 0U;
  };
  const auto continues = [&byte](std::size_t i) { return (byte(i) & 0xC0U) == 0x80U; };
  const unsigned lead = byte(0);
  const unsigned second = byte(1);
  if (lead < 0x80) return 1;
  if (lead < 0xC2) return 0;
  if (lead < 0xE0) return continues(1) ? 2 : 0;
  if (lead < 0xF0) {
    const bool overlong = lead == 0xE0 && second < 0xA0;
    const bool surrogate = lead == 0xED && second >= 0xA0;
    return continues(1) && continues(2) && !overlong && !surrogate ? 3 : 0;
  }
  const bool outside = lead > 0xF4 || (lead == 0xF0 && second < 0x90) || (lead == 0xF4 && second >= 0x90);
  return continues(1) && continues(2) && continues(3) && !outside ? 4 : 0;
}

std::size_t carriedCharacterLength(std::string_view text) {
  const std::size_t length = utf8CharacterLength(text);
  const std::string_view character = text.substr(0, length);
  const bool isControl = length == 1 && static_cast<unsigned char>(character[0]) < 0x20 &&
                         character != "\t" && character != "\n" && character != "\r";
  return isControl || character == "\xEF\xBF\xBE" || character == "\xEF\xBF\xBF" ? 0 : length;
}

namespace {

// Whether the length that the function gives is never 0 on the way through the text.
template <typename CharacterLength>
bool holdsOnly(std::string_view text, CharacterLength characterLength) {
  while (!text.empty()) {
    const std::size_t length = characterLength(text);
    if (length == 0) return false;
    text.remove_prefix(length);
  }
  return true;
}

}  // namespace

bool isUtf8(std::string_view text) {
  return holdsOnly(text, utf8CharacterLength);
}

bool isCarriedText(std::string_view text) {
  return holdsOnly(text, carriedCharacterLength);
}

void appendUtf8(std::string& out, char32_t codePoint) {
  const auto append = [&out](char32_t bits) { out += static_cast<char>(bits); };
  const auto appendRest = [&](unsigned shift) { append(0x80 | ((codePoint >> shift) & 0x3F)); };
  if (codePoint < 0x80) {
    append(codePoint);
  } else if (codePoint < 0x800) {
    append(0xC0 | codePoint >> 6);
    appendRest(0);
  } else if (codePoint < 0x10000) {
    append(0xE0 | codePoint >> 12);
    appendRest(6);
    appendRest(0);
  } else {
    append(0xF0 | codePoint >> 18);
    appendRest(12);
    appendRest(6);
    appendRest(0);
  }
}

}  // namespace tbdaily
