// The system log.
//
// Formats are the job's own constant texts, never text from outside: "%d" and "%llu" take a number, "%s" a
// text, "%@" an object (a string as it is, a number as its decimal text, a date in its default text form).
// "{public}" after the percent sign marks an argument that may be shown; texts and objects without the mark
// are private, numbers never are.
#pragma once

#include <array>
#include <concepts>
#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <variant>

#include "platform/plist_value.h"

namespace tbdaily {

enum class LogLevel : std::uint8_t { Default, Info, Debug, Error };

class LogArgument {
 public:
  template <std::signed_integral T>
  LogArgument(T number) : value_(static_cast<std::int64_t>(number)) {}
  template <std::unsigned_integral T>
  LogArgument(T number) : value_(static_cast<std::uint64_t>(number)) {}
  LogArgument(std::string_view text) : value_(text) {}
  LogArgument(const std::string& text) : value_(std::string_view(text)) {}
  LogArgument(const char* text) : value_(std::string_view(text)) {}
  LogArgument(const PlistValue& object) : value_(&object) {}  // borrowed for the call

  // Numbers are never private, as an object neither.
  bool isNumber() const;
  // The argument's full text, privacy aside.
  std::string text() const;

 private:
  std::variant<std::int64_t, std::uint64_t, std::string_view, const PlistValue*> value_;
};

class SystemLog {
 public:
  virtual ~SystemLog() = default;

  virtual bool isEnabled(LogLevel level) = 0;
  virtual void write(LogLevel level, std::string_view format, std::span<const LogArgument> arguments) = 0;
  // A plain message without a level.
  virtual void writePlain(std::string_view message) = 0;

  // log.message(LogLevel::Default, "daily tasks for day %d", day)
  template <typename... Arguments>
  void message(LogLevel level, std::string_view format, Arguments&&... arguments) {
    if (!isEnabled(level)) return;
    const std::array<LogArgument, sizeof...(Arguments)> list{
        LogArgument(std::forward<Arguments>(arguments))...};
    write(level, format, list);
  }
};

// Puts the arguments into the format. Texts and objects that the format does not mark public become
// "<private>" unless `showPrivate`.
std::string formatLogMessage(std::string_view format, std::span<const LogArgument> arguments,
                             bool showPrivate);

}  // namespace tbdaily
