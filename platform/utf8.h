// UTF-8, a character at a time.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace tbdaily {

// U+FFFD, what stands in the place of text that cannot be carried.
inline constexpr std::string_view kReplacementCharacter = "\xEF\xBF\xBD";

// The length in bytes of the character that the text begins with; 0 when it begins with none that is well
// formed (overlong forms, surrogates and everything above U+10FFFF are not) or is empty.
std::size_t utf8CharacterLength(std::string_view text);

// Whether all of the text is well-formed UTF-8.
bool isUtf8(std::string_view text);

// The length of the first character when an XML document can carry it: no control characters but tab, line
// feed and carriage return, no U+FFFE and U+FFFF. Else 0.
std::size_t carriedCharacterLength(std::string_view text);

// Whether all of the text can be stored and reported.
bool isCarriedText(std::string_view text);

// Whether a byte of UTF-8 is one behind the first of its character.
constexpr bool continuesCharacter(char c) {
  return (static_cast<unsigned char>(c) & 0xC0U) == 0x80U;
}

// The characters of a UTF-8 text that lie wholly within its first `most` bytes.
std::string_view wholeCharacters(std::string_view text, std::size_t most);

// `codePoint` is a Unicode scalar value.
void appendUtf8(std::string& out, char32_t codePoint);

// Where text from outside is going. A terminal that meets its characters must not obey them, a reader of
// lines must not take them for lines, and a person must see in which order they stand. Escaped are C0, DEL,
// C1, the marks that turn the direction of writing, and bytes that are no UTF-8, each but for what is said
// here.
enum class TextPlace : std::uint8_t {
  LogMessage,  // \x1b; line feeds, tabs and marks of direction stay
  Line,        // \x1b, \u202e
  Lines,       // the same; line feeds and tabs stay
  Json,        // \u001b in the string that it is part of; line feeds and tabs between strings stay
  Xml,         // &#x1b;, the same character to a reader; line feeds and tabs stay
};

// The text as it may stand there. What is escaped already stays as it is.
std::string withoutControls(std::string_view text, TextPlace place);

}  // namespace tbdaily
