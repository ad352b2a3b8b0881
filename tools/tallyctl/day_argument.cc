#include "tools/tallyctl/day_argument.h"

#include <charconv>
#include <optional>

#include "platform/calendar.h"

namespace tbdaily {

namespace {

constexpr DayNumber kLastDay = 2932896;  // 9999-12-31

template <typename Number>
std::optional<Number> whole(std::string_view digits) {
  Number number = 0;
  const auto [end, error] = std::from_chars(digits.data(), digits.data() + digits.size(), number);
  const bool isWhole = error == std::errc() && end == digits.data() + digits.size();
  return isWhole ? std::optional(number) : std::nullopt;
}

std::optional<DayNumber> calendarDay(std::string_view text) {
  constexpr std::string_view kPattern = "dddd-dd-dd";
  if (text.size() != kPattern.size()) return std::nullopt;
  for (std::size_t i = 0; i < text.size(); ++i) {
    const bool isDigit = text[i] >= '0' && text[i] <= '9';
    if (kPattern[i] == 'd' ? !isDigit : text[i] != kPattern[i]) return std::nullopt;
  }
  CivilTime time;
  time.year = *whole<unsigned>(text.substr(0, 4));
  time.month = *whole<unsigned>(text.substr(5, 2));
  time.day = *whole<unsigned>(text.substr(8, 2));
  if (time.month < 1 || time.month > 12 || time.day < 1) return std::nullopt;
  const DayNumber day = dayNumberOf(dateOfCivilTime(time));
  // A day that the month does not have would be one of the next month.
  return dayText(day) == text ? std::optional(day) : std::nullopt;
}

}  // namespace

Outcome<DayNumber> parseDay(std::string_view text, DayNumber today) {
  if (text == "today") return today;
  if (text == "yesterday") return today - 1;
  if (const auto day = calendarDay(text)) return *day;
  if (text.starts_with('-')) {
    if (const auto back = whole<DayNumber>(text.substr(1)); back && *back >= 0 && *back <= kLastDay)
      return today - *back;
  } else if (const auto day = whole<DayNumber>(text); day && *day >= 0 && *day <= kLastDay) {
    return *day;
  }
  return Failure{"\"" + std::string(text) + "\" is no day; a day is " + kDayArgumentHelp};
}

std::string dayText(DayNumber day) {
  std::string text = dateText(dateOf(day), DateFraction::Drop);
  return text.substr(0, text.find('T'));
}

}  // namespace tbdaily
