#include "platform/plist/json.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <nlohmann/json.hpp>
#include <utility>

#include "platform/calendar.h"
#include "platform/number_text.h"
#include "platform/plist/base64.h"
#include "platform/plist/builder.h"
#include "platform/plist/limits.h"

namespace tbdaily {

namespace {

using Json = nlohmann::json;

class JsonWriter {
 public:
  explicit JsonWriter(JsonLayout layout) : indented_(layout == JsonLayout::Indented) {}

  std::string write(const PlistValue& value) {
    writeValue(value, 0);
    return std::move(out_);
  }

 private:
  void writeValue(const PlistValue& value, std::size_t depth);
  void writeText(std::string_view text);
  void writeNumber(const PlistNumber& number);
  void writeData(std::span<const std::byte> bytes);
  void writeDate(PlistDate date);
  template <typename Container, typename WriteEntry>
  void writeContainer(char opening, char closing, const Container& container, std::size_t depth,
                      WriteEntry writeEntry);
  void breakLine(std::size_t depth) { out_.append("\n").append(2 * depth, ' '); }

  bool indented_;
  std::string out_;
};

void JsonWriter::writeValue(const PlistValue& value, std::size_t depth) {
  if (const auto number = value.asNumber()) {
    writeNumber(*number);
  } else if (const auto text = value.asString()) {
    writeText(*text);
  } else if (const PlistDictionary* entries = value.asDictionary()) {
    writeContainer('{', '}', *entries, depth, [&](const PlistDictionary::Entry& entry) {
      writeText(entry.first);
      out_ += ": ";
      writeValue(entry.second, depth + 1);
    });
  } else if (const PlistArray* elements = value.asArray()) {
    writeContainer('[', ']', *elements, depth,
                   [&](const PlistValue& element) { writeValue(element, depth + 1); });
  } else if (const auto flag = value.asBoolean()) {
    out_ += *flag ? "true" : "false";
  } else if (const auto date = value.asDate()) {
    writeDate(*date);
  } else if (const auto bytes = value.asData()) {
    writeData(*bytes);
  } else {
    out_ += "null";
  }
}

template <typename Container, typename WriteEntry>
void JsonWriter::writeContainer(char opening, char closing, const Container& container, std::size_t depth,
                                WriteEntry writeEntry) {
  out_ += opening;
  bool first = true;
  for (const auto& entry : container) {
    if (!first) out_ += indented_ ? "," : ", ";
    first = false;
    if (indented_) breakLine(depth + 1);
    writeEntry(entry);
  }
  if (indented_ && !first) breakLine(depth);
  out_ += closing;
}

void JsonWriter::writeText(std::string_view text) {
  const auto isPlain = [](char c) { return c >= 0x20 && c < 0x7F && c != '"' && c != '\\'; };
  if (std::ranges::all_of(text, isPlain)) {
    out_.append("\"").append(text).append("\"");
  } else {
    out_ += Json(text).dump(-1, ' ', false, Json::error_handler_t::replace);
  }
}

void JsonWriter::writeNumber(const PlistNumber& number) {
  if (!number.isReal()) {
    std::array<char, 24> digits{};
    out_.append(digits.data(),
                std::to_chars(digits.data(), digits.data() + digits.size(), number.toInt64()).ptr);
    return;
  }
  const double value = number.toDouble();
  if (!std::isfinite(value)) {
    out_ += "null";
    return;
  }
  const std::string text = realText(value);
  out_ += text;
  if (text.find_first_of(".e") == std::string::npos) out_ += ".0";
}

void JsonWriter::writeData(std::span<const std::byte> bytes) {
  out_ += '"';
  appendBase64(out_, bytes);
  out_ += '"';
}

void JsonWriter::writeDate(PlistDate date) {
  if (!isRepresentable(date)) {
    out_ += "null";
    return;
  }
  out_.append("\"").append(dateText(date, DateFraction::Keep)).append("\"");
}

// Builds the value from the parser's events; the parser itself keeps no stack that could overflow.
class ValueBuilder : public nlohmann::json_sax<Json> {
 public:
  PlistJsonResult take() {
    if (error_.empty()) return {builder_.takeRoot(), {}};
    return {{}, std::move(error_)};
  }

  bool null() override { return fail("null has no place in a property list"); }
  bool boolean(bool value) override { return add(PlistValue::boolean(value)); }
  bool number_integer(number_integer_t value) override { return add(PlistValue::int64(value)); }
  bool number_unsigned(number_unsigned_t value) override {
    if (!std::in_range<std::int64_t>(value))
      return fail("the integer " + std::to_string(value) + " does not fit 64 bits");
    return add(PlistValue::int64(static_cast<std::int64_t>(value)));
  }
  bool number_float(number_float_t value, const string_t& text) override {
    // The parser makes a real of an integer that is too long for its own integers.
    if (text.find_first_of(".eE") == string_t::npos) return fail("an integer that does not fit 64 bits");
    return add(PlistValue::float64(value));
  }
  bool string(string_t& value) override { return add(PlistValue::string(std::move(value))); }
  bool binary(binary_t&) override { return fail("not JSON"); }
  bool start_object(std::size_t) override { return open(PlistBuilder::Container::Dictionary); }
  bool start_array(std::size_t) override { return open(PlistBuilder::Container::Array); }
  bool end_object() override { return close(); }
  bool end_array() override { return close(); }
  bool key(string_t& value) override {
    builder_.setKey(std::move(value));
    return true;
  }
  bool parse_error(std::size_t position, const std::string&,
                   const nlohmann::detail::exception& error) override {
    const std::string_view text = error.what();
    return fail(text.find("out_of_range") == std::string_view::npos
                    ? "byte " + std::to_string(position) + ": not JSON"
                    : "byte " + std::to_string(position) + ": a number that is too large");
  }

 private:
  bool fail(std::string reason) {
    error_ = std::move(reason);
    return false;
  }

  bool open(PlistBuilder::Container kind) { return builder_.open(kind) || fail(kPlistNestingError); }
  bool close() {
    builder_.close();
    return true;
  }
  bool add(PlistValue value) {
    builder_.add(std::move(value));
    return true;
  }

  PlistBuilder builder_;
  std::string error_;
};

}  // namespace

std::string jsonText(const PlistValue& value, JsonLayout layout) {
  return JsonWriter(layout).write(value);
}

PlistJsonResult plistFromJson(std::string_view text) {
  try {
    // The parser takes a zero byte for the end of the text and would pass over what follows it.
    if (const std::size_t zero = text.find('\0'); zero != std::string_view::npos) {
      return {{}, "byte " + std::to_string(zero + 1) + ": not JSON"};
    }
    ValueBuilder builder;
    Json::sax_parse(text.begin(), text.end(), &builder);
    return builder.take();
  } catch (const std::exception&) {
    return {{}, "out of memory"};
  }
}

}  // namespace tbdaily
