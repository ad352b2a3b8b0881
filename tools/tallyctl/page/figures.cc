#include "tools/tallyctl/page/figures.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>

#include "platform/number_text.h"
#include "tools/tallyctl/terminal.h"

namespace tbdaily {

namespace {

void writeData(HtmlWriter& page, std::string_view whole, std::string_view shown) {
  page.markup("<data value=\"").text(whole).markup("\">").text(shown).markup("</data>");
}

// The digits before the point in groups of three.
std::string grouped(std::string number) {
  const std::size_t first = number.starts_with('-') ? 1 : 0;
  for (std::size_t i = std::min(number.find_first_not_of("0123456789", first), number.size());
       i > first + 3;) {
    i -= 3;
    number.insert(i, 1, ',');
  }
  return number;
}

// With so many digits behind the point that there are three.
std::string threeDigits(double value) {
  std::array<char, 512> text;  // the longest double has 309 digits before its point
  const double size = std::fabs(value);
  const int digits = size < 9.995 ? 2 : size < 99.95 ? 1 : 0;
  std::snprintf(text.data(), text.size(), "%.*f", digits, value);
  return text.data();
}

}  // namespace

std::string groupedDigits(std::int64_t value) {
  return grouped(std::to_string(value));
}

std::string scaleText(double value, std::string_view unit) {
  static constexpr std::array<std::string_view, 7> kPrefixes = {"", "k", "M", "G", "T", "P", "E"};
  std::size_t prefix = 0;
  while (std::fabs(value) >= 999.5 && prefix + 1 < kPrefixes.size()) value /= 1000, ++prefix;
  std::array<char, 32> digits;
  std::snprintf(digits.data(), digits.size(), "%.3g", value);
  return std::string(digits.data()).append(unit.empty() ? "" : " ").append(kPrefixes[prefix]).append(unit);
}

void writeFigure(HtmlWriter& page, std::int64_t value) {
  const std::string whole = std::to_string(value), shown = groupedDigits(value);
  whole == shown ? static_cast<void>(page.text(shown)) : writeData(page, whole, shown);
}

void writeFigure(HtmlWriter& page, double value) {
  const std::string whole = realText(value);
  if (std::isinf(value)) return writeData(page, whole, value < 0 ? "-\u221e" : "\u221e");
  const std::string shown = std::isnan(value) ? "not a number" : grouped(sixDigits(value));
  whole == shown ? static_cast<void>(page.text(shown)) : writeData(page, whole, shown);
}

void writeFigureAs(HtmlWriter& page, double value, std::string_view text) {
  writeData(page, realText(value), text);
}

std::string twoDecimals(double value) {
  std::array<char, 512> text;  // the longest double has 309 digits before its point
  std::snprintf(text.data(), text.size(), "%.2f", value);
  return text.data();
}

std::string driveSizeText(double bytes) {
  static constexpr std::array<std::string_view, 7> kUnits = {" B", " kB", " MB", " GB", " TB", " PB", " EB"};
  std::size_t unit = 0;
  while (bytes >= 999.5 && unit + 1 < kUnits.size()) bytes /= 1000, ++unit;
  return (unit == 0 ? std::to_string(std::llround(bytes)) : threeDigits(bytes)).append(kUnits[unit]);
}

}  // namespace tbdaily
