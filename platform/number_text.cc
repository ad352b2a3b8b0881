#include "platform/number_text.h"

#include <array>
#include <charconv>
#include <cmath>
#include <string_view>

namespace tbdaily {

namespace {

// "d.ddde±xx", the shortest such text, to positional text where that is readable.
std::string fromScientific(std::string_view scientific) {
  const bool negative = scientific.front() == '-';
  if (negative) scientific.remove_prefix(1);
  const std::size_t mark = scientific.find('e');
  int exponent = 0;
  const char* exponentText = scientific.data() + mark + 1;
  if (*exponentText == '+') ++exponentText;
  std::from_chars(exponentText, scientific.data() + scientific.size(), exponent);

  std::string digits(1, scientific.front());
  if (mark > 2) digits += scientific.substr(2, mark - 2);
  std::string text(negative ? "-" : "");
  if (exponent < -5 || exponent >= 16) return text += scientific;
  if (exponent < 0) {
    text += "0.";
    text.append(static_cast<std::size_t>(-exponent - 1), '0');
    return text += digits;
  }
  const auto whole = static_cast<std::size_t>(exponent) + 1;
  if (digits.size() < whole) digits.append(whole - digits.size(), '0');
  text.append(digits, 0, whole);
  if (digits.size() > whole) text.append(".").append(digits, whole);
  return text;
}

template <typename Real>
std::string shortestText(Real value) {
  if (std::isnan(value)) return "nan";
  if (std::isinf(value)) return value < 0 ? "-inf" : "inf";
  std::array<char, 64> buffer;
  const auto end =
      std::to_chars(buffer.data(), buffer.data() + buffer.size(), value, std::chars_format::scientific).ptr;
  return fromScientific({buffer.data(), static_cast<std::size_t>(end - buffer.data())});
}

}  // namespace

std::string realText(double value) {
  return shortestText(value);
}
std::string realText(float value) {
  return shortestText(value);
}

std::string numberText(const PlistNumber& number) {
  if (!number.isReal()) return std::to_string(number.toInt64());
  return number.kind() == NumberKind::Float32 ? realText(static_cast<float>(number.toDouble()))
                                              : realText(number.toDouble());
}

}  // namespace tbdaily
