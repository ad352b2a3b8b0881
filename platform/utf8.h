// UTF-8, a character at a time.
#pragma once

#include <cstddef>
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

// `codePoint` is a Unicode scalar value.
void appendUtf8(std::string& out, char32_t codePoint);

}  // namespace tbdaily
