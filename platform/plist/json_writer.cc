#include "platform/plist/json_writer.h"

#include <algorithm>
#include <cmath>
#include <nlohmann/json.hpp>

#include "platform/calendar.h"
#include "platform/number_text.h"
#include "platform/plist/base64.h"
#include "platform/utf8.h"

namespace tbdaily {

JsonWriter::Scope JsonWriter::open(char opening, char closing) {
  if (!afterKey_) startEntry();
  afterKey_ = false;
  begin(opening);
  return {*this, closing};
}

void JsonWriter::begin(char opening) {
  out_ += opening;
  ++depth_;
  isFirst_ = true;
}

void JsonWriter::close(char closing) {
  --depth_;
  if (indented_ && !isFirst_) out_.append("\n").append(2 * depth_, ' ');
  out_ += closing;
  isFirst_ = false;
}

void JsonWriter::startEntry() {
  if (depth_ == 0) return;
  if (!isFirst_) out_ += indented_ ? "," : ", ";
  if (indented_) out_.append("\n").append(2 * depth_, ' ');
  isFirst_ = false;
}

void JsonWriter::writeKey(std::string_view key) {
  startEntry();
  write(key);
  out_ += ": ";
  afterKey_ = true;
}

void JsonWriter::write(std::string_view text) {
  const auto isPlain = [](char c) { return c >= 0x20 && c < 0x7F && c != '"' && c != '\\'; };
  if (std::ranges::all_of(text, isPlain)) {
    out_.append("\"").append(text).append("\"");
  } else {
    const std::string string =
        nlohmann::json(text).dump(-1, ' ', false, nlohmann::json::error_handler_t::replace);
    out_ += withoutControls(string, TextPlace::Json);
  }
}

void JsonWriter::write(double value) {
  if (!std::isfinite(value)) return write(std::nullopt);
  const std::string text = realText(value);
  out_ += text;
  if (text.find_first_of(".e") == std::string::npos) out_ += ".0";
}

void JsonWriter::write(std::span<const std::byte> bytes) {
  out_ += '"';
  appendBase64(out_, bytes);
  out_ += '"';
}

void JsonWriter::write(PlistDate date) {
  if (!isRepresentable(date)) return write(std::nullopt);
  out_.append("\"").append(dateText(date, DateFraction::Keep)).append("\"");
}

void JsonWriter::write(const PlistValue& value) {
  if (const auto number = value.asNumber()) {
    number->isReal() ? write(number->toDouble()) : write(number->toInt64());
  } else if (const auto text = value.asString()) {
    write(*text);
  } else if (const PlistDictionary* entries = value.asDictionary()) {
    begin('{');
    for (const auto& [key, entry] : *entries) add(key, entry);
    close('}');
  } else if (const PlistArray* elements = value.asArray()) {
    begin('[');
    for (const PlistValue& element : *elements) add(element);
    close(']');
  } else if (const auto flag = value.asBoolean()) {
    write(*flag);
  } else if (const auto date = value.asDate()) {
    write(*date);
  } else if (const auto bytes = value.asData()) {
    write(*bytes);
  } else {
    write(std::nullopt);
  }
}

}  // namespace tbdaily
