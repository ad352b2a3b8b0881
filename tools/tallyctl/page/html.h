// Writes HTML that no text from outside can become a part of.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <utility>

namespace tbdaily {

// What of a page is markup: a literal of the program's own source, which the compiler sees to.
class Markup {
 public:
  template <std::size_t kSize>
  consteval Markup(const char (&literal)[kSize]) : bytes_(literal, kSize - 1) {}
  std::string_view bytes() const { return bytes_; }

 private:
  std::string_view bytes_;
};

class HtmlWriter {
 public:
  HtmlWriter& markup(Markup markup) {
    out_ += markup.bytes();
    return *this;
  }
  // As it reads, between tags and in quoted attributes alike: what HTML would take for its own is a
  // reference; controls, marks of direction and bytes that are no UTF-8 are escapes, as on a terminal.
  HtmlWriter& text(std::string_view text);
  // A coordinate or length, in hundredths; `value` is finite and within a million.
  HtmlWriter& coordinate(double value);

  std::string take() { return std::move(out_); }

 private:
  std::string out_;
};

}  // namespace tbdaily
