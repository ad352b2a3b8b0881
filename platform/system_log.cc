#include "platform/system_log.h"

#include "platform/hexadecimal.h"
#include "platform/number_text.h"

namespace tbdaily {

namespace {

constexpr std::string_view kPrivate = "<private>";
constexpr std::string_view kPublicMark = "{public}";
constexpr std::array<std::string_view, 4> kConversions = {"d", "llu", "s", "@"};

void appendQuoted(std::string& out, std::string_view text) {
  out += '"';
  for (const char c : text) {
    switch (c) {
      case '"':
        out += "\\\"";
        break;
      case '\\':
        out += "\\\\";
        break;
      case '\n':
        out += "\\n";
        break;
      case '\r':
        out += "\\r";
        break;
      case '\t':
        out += "\\t";
        break;
      default:
        out += c;
    }
  }
  out += '"';
}

std::string logDateText(PlistDate date) {
  std::string text = dateText(date, DateFraction::Drop);
  text[text.find('T')] = ' ';
  text.replace(text.size() - 1, 1, " +0000");
  return text;
}

void appendText(std::string& out, const PlistValue& value, bool quoteStrings) {
  if (const auto text = value.asString()) {
    quoteStrings ? appendQuoted(out, *text) : void(out += *text);
  } else if (const auto number = value.asNumber()) {
    out += numberText(*number);
  } else if (const auto boolean = value.asBoolean()) {
    out += *boolean ? '1' : '0';
  } else if (const auto date = value.asDate()) {
    out += logDateText(*date);
  } else if (const auto data = value.asData()) {
    out += '<';
    appendHexadecimal(out, *data);
    out += '>';
  } else if (const PlistArray* array = value.asArray()) {
    out += '[';
    for (const PlistValue& element : *array) {
      if (&element != array->data()) out += ", ";
      appendText(out, element, true);
    }
    out += ']';
  } else if (const PlistDictionary* dictionary = value.asDictionary()) {
    out += '{';
    bool first = true;
    for (const auto& [key, entry] : *dictionary) {
      if (!first) out += ", ";
      first = false;
      appendQuoted(out, key);
      out += ": ";
      appendText(out, entry, true);
    }
    out += '}';
  } else {
    out += "(null)";
  }
}

}  // namespace

std::string plistText(const PlistValue& value) {
  std::string text;
  appendText(text, value, false);
  return text;
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
