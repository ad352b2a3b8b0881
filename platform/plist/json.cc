#include "platform/plist/json.h"

#include <nlohmann/json.hpp>
#include <utility>

#include "platform/plist/builder.h"
#include "platform/plist/limits.h"

namespace tbdaily {

namespace {

using Json = nlohmann::json;

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
    builder_.setKey(value);
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
  JsonWriter json(layout);
  json.add(value);
  return json.take();
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
