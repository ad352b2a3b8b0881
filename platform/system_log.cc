#include "platform/system_log.h"

#include "platform/plist_text.h"

namespace tbdaily {

namespace {

constexpr std::string_view kPrivate = "<private>";
constexpr std::string_view kPublicMark = "{public}";
constexpr std::array<std::string_view, 4> kConversions = {"d", "llu", "s", "@"};

}  // namespace

bool LogArgument::isNumber() const {
  const auto* object = std::get_if<const PlistValue*>(&value_);
  return object != nullptr ? (*object)->asNumber().has_value() : value_.index() <= 1;
}

std::string LogArgument::text() const {
  if (const auto* number = std::get_if<std::int64_t>(&value_)) return std::to_string(*number);
  if (const auto* number = std::get_if<std::uint64_t>(&value_)) return std::to_string(*number);
  if (const auto* text = std::get_if<std::string_view>(&value_)) return std::string(*text);
  return plistText(*std::get<const PlistValue*>(value_));
}

std::string formatLogMessage(std::string_view format, std::span<const LogArgument> arguments,
                             bool showPrivate) {
  std::string message;
  std::size_t next = 0;
  while (!format.empty()) {
    const std::size_t percent = format.find('%');
    message += format.substr(0, percent);
    if (percent == std::string_view::npos) break;
    format.remove_prefix(percent + 1);
    if (format.starts_with('%')) {
      message += '%';
      format.remove_prefix(1);
      continue;
    }
    const bool isPublic = format.starts_with(kPublicMark);
    if (isPublic) format.remove_prefix(kPublicMark.size());
    std::string_view conversion;
    for (const std::string_view candidate : kConversions) {
      if (format.starts_with(candidate)) conversion = candidate;
    }
    format.remove_prefix(conversion.size());
    if (next >= arguments.size()) continue;
    const LogArgument& argument = arguments[next++];
    if (argument.isNumber() || isPublic || showPrivate) {
      message += argument.text();
    } else {
      message += kPrivate;
    }
  }
  return message;
}

}  // namespace tbdaily
