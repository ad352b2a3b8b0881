#include "tools/tallyctl/page/html.h"

#include <cmath>
#include <cstdint>

#include "platform/number_text.h"
#include "platform/utf8.h"

namespace tbdaily {

namespace {

std::string_view referenceOf(char c) {
  switch (c) {
    case '&':
      return "&amp;";
    case '<':
      return "&lt;";
    case '>':
      return "&gt;";
    case '"':
      return "&quot;";
    default:
      return "&#39;";
  }
}

}  // namespace

HtmlWriter& HtmlWriter::text(std::string_view text) {
  const std::string shown = withoutControls(text, TextPlace::Line);
  std::string_view rest = shown;
  for (;;) {
    const std::size_t plain = rest.find_first_of("&<>\"'");
    out_ += rest.substr(0, plain);
    if (plain == std::string_view::npos) return *this;
    out_ += referenceOf(rest[plain]);
    rest.remove_prefix(plain + 1);
  }
}

HtmlWriter& HtmlWriter::coordinate(double value) {
  out_ += realText(std::round(value * 100) / 100);
  return *this;
}

}  // namespace tbdaily
