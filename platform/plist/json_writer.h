// Writes JSON, value by value.
//
//   JsonWriter json(JsonLayout::Indented);
//   {
//     const auto root = json.object();
//     json.add("name", name);         // an optional without a value is null
//     const auto list = json.array("values");
//     for (const std::uint64_t value : values) json.add(value);
//   }
//   std::string text = json.take();
#pragma once

#include <concepts>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>

#include "platform/plist_value.h"

namespace tbdaily {

enum class JsonLayout : std::uint8_t {
  OneLine,  // {"a": 1, "b": [2, 3]}
  Indented  // one entry a line, two spaces a level; no line feed at the end
};

// Integers in full, reals in the shortest text that reads back to the same double (always with a point or an
// exponent), data as base64, dates as RFC 3339 text with their fraction; null for a real that is not finite,
// a date outside of the calendar, and an absent value. Text that is no UTF-8 has U+FFFD in its place; control
// characters and marks of direction in a text are escapes, so that the whole may be shown on a terminal.
class JsonWriter {
 public:
  // Closes what it stands for when it goes. Must not outlive the writer.
  class Scope {
   public:
    ~Scope() { writer_.close(closing_); }
    Scope(const Scope&) = delete;
    Scope& operator=(const Scope&) = delete;

   private:
    friend class JsonWriter;
    Scope(JsonWriter& writer, char closing) : writer_(writer), closing_(closing) {}
    JsonWriter& writer_;
    char closing_;
  };

  explicit JsonWriter(JsonLayout layout) : indented_(layout == JsonLayout::Indented) {}

  [[nodiscard]] Scope object() { return open('{', '}'); }
  [[nodiscard]] Scope array() { return open('[', ']'); }
  // As entries of an object.
  [[nodiscard]] Scope object(std::string_view key) { return writeKey(key), object(); }
  [[nodiscard]] Scope array(std::string_view key) { return writeKey(key), array(); }

  // An element of an array, or the root.
  template <typename Value>
  void add(const Value& value) {
    if (!afterKey_) startEntry();
    afterKey_ = false;
    write(value);
  }
  // An entry of an object.
  template <typename Value>
  void add(std::string_view key, const Value& value) {
    writeKey(key);
    add(value);
  }

  std::string take() { return std::move(out_); }

 private:
  Scope open(char opening, char closing);
  void begin(char opening);
  void close(char closing);
  void startEntry();
  void writeKey(std::string_view key);

  void write(std::nullopt_t) { out_ += "null"; }
  void write(bool value) { out_ += value ? "true" : "false"; }
  template <std::integral Number>
  void write(Number value) {
    out_ += std::to_string(value);
  }
  void write(double value);
  void write(std::string_view text);
  void write(const std::string& text) { write(std::string_view(text)); }
  void write(const char* text) { write(std::string_view(text)); }
  void write(std::span<const std::byte> bytes);
  void write(PlistDate date);
  void write(const PlistValue& value);
  template <typename Value>
  void write(const std::optional<Value>& value) {
    value ? write(*value) : write(std::nullopt);
  }

  bool indented_;
  bool afterKey_ = false;  // what comes next belongs to the key that was written
  bool isFirst_ = true;    // of its container
  std::size_t depth_ = 0;
  std::string out_;
};

}  // namespace tbdaily
