#include "platform/utf8.h"

#include <array>
#include <cstdio>
#include <cstring>

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

// Whether the next eight bytes are ASCII characters and no controls but DEL.
bool beginsPlain(std::string_view text) {
  constexpr std::uint64_t kHighBits = 0x8080808080808080, kSpaces = 0x2020202020202020;
  std::uint64_t word = 0;
  if (text.size() < sizeof word) return false;
  std::memcpy(&word, text.data(), sizeof word);
  // A byte below a space borrows from its high bit.
  return ((word | (word - kSpaces)) & kHighBits) == 0;
}

// Whether the length that the function gives is never 0 on the way through the text, where plain characters
// have a length of 1.
template <typename CharacterLength>
bool holdsOnly(std::string_view text, CharacterLength characterLength) {
  while (!text.empty()) {
    if (beginsPlain(text)) {
      text.remove_prefix(sizeof(std::uint64_t));
      continue;
    }
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

std::string_view wholeCharacters(std::string_view text, std::size_t most) {
  if (text.size() <= most) return text;
  while (most > 0 && continuesCharacter(text[most])) --most;
  return text.substr(0, most);
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

namespace {

struct Notation {
  std::string_view opening;
  int digits;  // hexadecimal ones, at least
  std::string_view closing;
};

struct EscapeRules {
  bool keepsLineFeedAndTab;
  bool keepsDirection;
  Notation byte;       // up to U+00FF
  Notation character;  // above
};

constexpr Notation kByte = {"\\x", 2, ""};
constexpr Notation kCharacter = {"\\u", 4, ""};
constexpr Notation kReference = {"&#x", 2, ";"};

// In the order of TextPlace.
constexpr std::array<EscapeRules, 5> kEscapeRules = {{
    {true, true, kByte, kCharacter},
    {false, false, kByte, kCharacter},
    {true, false, kByte, kCharacter},
    {true, false, kCharacter, kCharacter},
    {true, false, kReference, kReference},
}};

void appendEscape(std::string& out, char32_t codePoint, const EscapeRules& rules) {
  const Notation& notation = codePoint < 0x100 ? rules.byte : rules.character;
  std::array<char, 16> digits;
  std::snprintf(digits.data(), digits.size(), "%0*x", notation.digits, static_cast<unsigned>(codePoint));
  out.append(notation.opening).append(digits.data()).append(notation.closing);
}

constexpr bool isControl(char32_t c) {
  return c < 0x20 || (c >= 0x7F && c < 0xA0);
}

constexpr bool turnsDirection(char32_t c) {
  return c == 0x61C || c == 0x200E || c == 0x200F || (c >= 0x202A && c <= 0x202E) ||
         (c >= 0x2066 && c <= 0x2069);
}

// Of a character of one to three bytes; longer ones are neither controls nor marks.
char32_t codePointOf(std::string_view character) {
  const auto bits = [character](std::size_t i) { return static_cast<unsigned char>(character[i]) & 0x3FU; };
  switch (character.size()) {
    case 1:
      return static_cast<unsigned char>(character[0]);
    case 2:
      return (bits(0) & 0x1FU) << 6 | bits(1);
    case 3:
      return (bits(0) & 0x0FU) << 12 | bits(1) << 6 | bits(2);
    default:
      return 0x10000;
  }
}

bool isKept(char32_t c, const EscapeRules& rules) {
  if (c == '\n' || c == '\t') return rules.keepsLineFeedAndTab;
  return !isControl(c) && (rules.keepsDirection || !turnsDirection(c));
}

}  // namespace

std::string withoutControls(std::string_view text, TextPlace place) {
  const EscapeRules& rules = kEscapeRules[static_cast<std::size_t>(place)];
  std::string shown;
  shown.reserve(text.size());
  while (!text.empty()) {
    const std::size_t length = utf8CharacterLength(text);
    const std::string_view character = text.substr(0, length == 0 ? 1 : length);
    const char32_t codePoint = codePointOf(character);
    if (length != 0 && isKept(codePoint, rules)) {
      shown += character;
    } else {
      appendEscape(shown, codePoint, rules);
    }
    text.remove_prefix(character.size());
  }
  return shown;
}

}  // namespace tbdaily
