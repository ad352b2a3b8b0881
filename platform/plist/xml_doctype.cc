#include "platform/plist/xml_doctype.h"

#include "platform/utf8.h"

namespace tbdaily {

namespace {

constexpr std::size_t kEnd = std::string_view::npos;

// The offset behind the next `mark` from `at` on.
std::size_t behind(std::string_view text, std::string_view mark, std::size_t at) {
  const std::size_t place = text.find(mark, at);
  return place == kEnd ? kEnd : place + mark.size();
}

// The offset behind a comment or a processing instruction that begins at `at`; `at` itself where none does.
std::size_t behindAside(std::string_view text, std::size_t at) {
  if (text.substr(at).starts_with("<!--")) return behind(text, "-->", at + 4);
  if (text.substr(at).starts_with("<?")) return behind(text, "?>", at + 2);
  return at;
}

// The offset behind the declaration whose contents begin at `at`.
std::size_t behindDeclaration(std::string_view text, std::size_t at) {
  bool inSubset = false;
  while (at != kEnd && (at = text.find_first_of("\"'[]<>", at)) != kEnd) {
    const char c = text[at];
    const std::size_t behindHere = inSubset ? behindAside(text, at) : at;
    if (behindHere != at) {
      at = behindHere;
    } else if (c == '"' || c == '\'') {
      at = behind(text, text.substr(at, 1), at + 1);
    } else if (c == '>' && !inSubset) {
      return at + 1;
    } else {
      if (c == '[') inSubset = true;
      if (c == ']') inSubset = false;
      ++at;
    }
  }
  return kEnd;
}

}  // namespace

DoctypePlace findDoctype(std::string_view document) {
  constexpr std::string_view kByteOrderMark = "\xEF\xBB\xBF", kDoctype = "<!DOCTYPE", kSpace = " \t\r\n";
  std::size_t at = document.starts_with(kByteOrderMark) ? kByteOrderMark.size() : 0;
  while ((at = document.find_first_not_of(kSpace, at)) != kEnd) {
    if (document.substr(at).starts_with(kDoctype)) {
      const std::size_t end = behindDeclaration(document, at + kDoctype.size());
      return end == kEnd ? DoctypePlace{} : DoctypePlace{at, end};
    }
    const std::size_t behindHere = behindAside(document, at);
    if (behindHere == at || behindHere == kEnd) return {};
    at = behindHere;
  }
  return {};
}

std::string blankOf(std::string_view text) {
  std::string blank;
  for (const char c : text) {
    if (!continuesCharacter(c)) blank += c == '\n' || c == '\r' ? c : ' ';
  }
  return blank;
}

}  // namespace tbdaily
