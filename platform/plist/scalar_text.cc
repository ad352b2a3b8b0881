#include "platform/plist/scalar_text.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <concepts>
#include <limits>
#include <string>
#include <utility>

#include "platform/calendar.h"

namespace tbdaily {

namespace {

bool isDigit(char c) {
  return c >= '0' && c <= '9';
}

std::string_view trimmed(std::string_view text) {
  while (!text.empty() && isXmlSpace(text.front())) text.remove_prefix(1);
  while (!text.empty() && isXmlSpace(text.back())) text.remove_suffix(1);
  return text;
}

// Takes a sign off the front; whether it was a minus.
bool takeSign(std::string_view& text) {
  const bool negative = text.starts_with('-');
  if (negative || text.starts_with('+')) text.remove_prefix(1);
  return negative;
}

bool equalsInLowerCase(std::string_view text, std::string_view lower) {
  return std::ranges::equal(text, lower,
                            [](char a, char b) { return a == b || (a >= 'A' && a <= 'Z' && a + 32 == b); });
}

// Whether a decimal text of a number that a real cannot hold is too large for it, rather than too small.
bool isTooLarge(std::string_view text) {
  const std::size_t mark = std::min(text.find_first_of("eE"), text.size());
  const std::string_view digits = text.substr(0, mark);
  const auto point = static_cast<std::int64_t>(std::min(digits.find('.'), digits.size()));
  const std::size_t firstDigit = digits.find_first_not_of("0.");
  if (firstDigit == std::string_view::npos) return false;
  std::string_view exponentText = text.substr(std::min(mark + 1, text.size()));
  const bool negative = takeSign(exponentText);
  std::int64_t exponent = 0;
  const char* const end = exponentText.data() + exponentText.size();
  if (std::from_chars(exponentText.data(), end, exponent).ec == std::errc::result_out_of_range)
    return !negative;
  // Each side is beyond what a buffer in memory can outweigh, so that their sum cannot overflow.
  constexpr std::int64_t kBeyond = std::int64_t{1} << 60;
  return point - static_cast<std::int64_t>(firstDigit) + std::min(exponent, kBeyond) * (negative ? -1 : 1) >
         0;
}

template <std::floating_point Real>
std::optional<Real> realOf(std::string_view text) {
  text = trimmed(text);
  const Real sign = takeSign(text) ? Real{-1} : Real{1};
  if (equalsInLowerCase(text, "nan")) return std::numeric_limits<Real>::quiet_NaN();
  if (equalsInLowerCase(text, "inf") || equalsInLowerCase(text, "infinity")) {
    return sign * std::numeric_limits<Real>::infinity();
  }
  if (text.empty() || (!isDigit(text.front()) && text.front() != '.')) return std::nullopt;
  Real value = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (error == std::errc::invalid_argument || end != text.data() + text.size()) return std::nullopt;
  if (error == std::errc::result_out_of_range) {
    if (isTooLarge(text)) return std::nullopt;
    value = 0;
  }
  return sign * value;
}

// The value of the digits behind a point; too many for a double are rounded.
double fractionOf(std::string_view digits) {
  const std::string text = std::string("0.").append(digits);
  double value = 0;
  std::from_chars(text.data(), text.data() + text.size(), value);
  return value;
}

// The digits of 1 - 0.digits, where that is less than 1.
std::string complementOf(std::string_view digits) {
  const std::size_t last = digits.find_last_not_of('0');
  std::string complement(digits.substr(0, last + 1));
  for (char& digit : complement) digit = static_cast<char>('9' - digit + '0');
  ++complement.back();
  return complement;
}

// The second before the reference is the only one in which a double holds more digits than the sum of a whole
// second and a fraction: dates in it go by their distance from the reference.
bool isInLastSecond(double seconds) {
  return seconds > -1 && seconds < 0;
}

// Reads fixed fields from the front of a date's text.
class FieldReader {
 public:
  explicit FieldReader(std::string_view text) : rest_(text) {}

  bool done() const { return !failed_ && rest_.empty(); }
  bool nextIs(char c) const { return rest_.starts_with(c); }
  void expect(char c) {
    failed_ = failed_ || !nextIs(c);
    if (!failed_) rest_.remove_prefix(1);
  }
  // All digits that follow, as many as the limits say.
  std::string_view digits(std::size_t least, std::size_t most) {
    const auto length = static_cast<std::size_t>(std::ranges::find_if_not(rest_, isDigit) - rest_.begin());
    failed_ = failed_ || length < least || length > most;
    const std::string_view taken = rest_.substr(0, failed_ ? 0 : length);
    rest_.remove_prefix(taken.size());
    return taken;
  }
  unsigned number(std::size_t least, std::size_t most) {
    const std::string_view text = digits(least, most);
    unsigned value = 0;
    std::from_chars(text.data(), text.data() + text.size(), value);
    return value;
  }
  // A sign goes with years of four digits and more, none with exactly four.
  std::int64_t year() {
    constexpr std::size_t kMostYearDigits = 9;
    const bool isSigned = nextIs('-') || nextIs('+');
    const bool negative = takeSign(rest_);
    const auto value = static_cast<std::int64_t>(number(4, isSigned ? kMostYearDigits : 4));
    return negative ? -value : value;
  }
  std::string_view fractionDigits() {
    if (!nextIs('.')) return {};
    expect('.');
    return digits(1, std::string_view::npos);
  }

 private:
  std::string_view rest_;
  bool failed_ = false;
};

}  // namespace

std::optional<PlistNumber> integerOfText(std::string_view text, int bits) {
  text = trimmed(text);
  if (text.starts_with('+')) {
    text.remove_prefix(1);
    if (text.starts_with('-')) return std::nullopt;
  }
  std::int64_t value = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
  if (bits == 64) return PlistNumber::int64(value);
  if (bits == 32) {
    return std::in_range<std::int32_t>(value)
               ? std::optional(PlistNumber::int32(static_cast<std::int32_t>(value)))
               : std::nullopt;
  }
  return std::in_range<std::int8_t>(value) ? std::optional(PlistNumber::int8(static_cast<std::int8_t>(value)))
                                           : std::nullopt;
}

std::optional<PlistNumber> realOfText(std::string_view text, int bits) {
  if (bits == 32) {
    const auto value = realOf<float>(text);
    return value ? std::optional(PlistNumber::float32(*value)) : std::nullopt;
  }
  const auto value = realOf<double>(text);
  return value ? std::optional(PlistNumber::float64(*value)) : std::nullopt;
}

std::string exactDateText(PlistDate date) {
  if (!isInLastSecond(date.secondsSinceReference)) return dateText(date, DateFraction::Keep);
  std::array<char, 1100> buffer{};  // room for the smallest double with all its zeros
  const auto end = std::to_chars(buffer.data(), buffer.data() + buffer.size(), -date.secondsSinceReference,
                                 std::chars_format::fixed)
                       .ptr;
  return "2000-12-31T23:59:59." + complementOf({buffer.data() + 2, end}) + 'Z';
}

std::optional<PlistDate> dateOfText(std::string_view text) {
  FieldReader fields(trimmed(text));
  CivilTime time;
  time.year = fields.year();
  fields.expect('-');
  time.month = fields.number(2, 2);
  fields.expect('-');
  time.day = fields.number(2, 2);
  fields.expect('T');
  time.hour = fields.number(2, 2);
  fields.expect(':');
  time.minute = fields.number(2, 2);
  fields.expect(':');
  time.second = fields.number(2, 2);
  const std::string_view fraction = fields.fractionDigits();
  fields.expect('Z');
  if (!fields.done()) return std::nullopt;
  if (time.month < 1 || time.month > 12 || time.day < 1 || time.hour > 23 || time.minute > 59 ||
      time.second > 59) {
    return std::nullopt;
  }
  // A day that the month does not have comes back as one of the next month.
  const PlistDate wholeSecond = dateOfCivilTime(time);
  if (!isRepresentable(wholeSecond) || civilTime(wholeSecond).day != time.day) return std::nullopt;
  if (fraction.find_first_not_of('0') == std::string_view::npos) return wholeSecond;
  if (wholeSecond.secondsSinceReference == -1) return PlistDate{-fractionOf(complementOf(fraction))};
  const PlistDate date{wholeSecond.secondsSinceReference + fractionOf(fraction)};
  return isRepresentable(date) ? std::optional(date) : std::nullopt;
}

}  // namespace tbdaily
