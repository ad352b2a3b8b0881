#include "tools/tallyctl/app_records.h"

#include <array>
#include <functional>
#include <optional>

#include "platform/hexadecimal.h"

namespace tbdaily {

namespace {

constexpr std::size_t kUuidSize = 16;

PlistValue uuidOfText(std::string_view text) {
  constexpr std::string_view kPattern = "xxxxxxxx-xxxx-xxxx-xxxx-xxxxxxxxxxxx";
  if (text.size() != kPattern.size()) return {};
  PlistData bytes;
  for (std::size_t i = 0; i < text.size();) {
    if (kPattern[i] == '-') {
      if (text[i++] != '-') return {};
      continue;
    }
    const auto high = hexadecimalDigit(text[i]);
    const auto low = hexadecimalDigit(text[i + 1]);
    if (!high || !low) return {};
    bytes.push_back(static_cast<std::byte>(*high << 4 | *low));
    i += 2;
  }
  return PlistValue::data(std::move(bytes));
}

PlistValue uuid(const PlistValue& value) {
  if (const auto text = value.asString()) return uuidOfText(*text);
  const auto data = value.asData();
  return data && data->size() == kUuidSize ? value : PlistValue();
}
PlistValue text(const PlistValue& value) {
  return value.asString() ? value : PlistValue();
}
PlistValue integer(const PlistValue& value) {
  const auto number = value.asInteger();
  return number ? PlistValue::int64(*number) : PlistValue();
}

struct Field {
  std::string_view wireName;
  std::string_view reportName;
  PlistValue (*convert)(const PlistValue&);
  std::string_view expected;
};

constexpr std::array<Field, 5> kFields = {{
    {"bundle_id", "bundle", text, "a text"},
    {"version", "version", text, "a text"},
    {"kestrel_id", "kestrelID", integer, "an integer"},
    {"arch", "arch", integer, "an integer"},
    {"uuid", "uuid", uuid, "16 bytes or a UUID's text"},
}};

}  // namespace

Outcome<PlistValue> appRecordsForMessage(const PlistValue& value) {
  const PlistArray* records = value.asArray();
  if (records == nullptr) return Failure{"it is no array of app records"};
  PlistArray elements;
  for (const PlistValue& record : *records) {
    const std::string number = std::to_string(elements.size() + 1);
    const PlistDictionary* given = record.asDictionary();
    if (given == nullptr) return Failure{"app record " + number + " is no dictionary"};
    PlistDictionary element;
    for (const Field& field : kFields) {
      const PlistValue* found = given->find(field.wireName);
      if (found == nullptr) found = given->find(field.reportName);
      PlistValue converted = found != nullptr ? field.convert(*found) : PlistValue();
      if (converted.isNone()) {
        return Failure{"app record " + number + " needs " + std::string(field.expected) + " as \"" +
                       std::string(field.wireName) + "\""};
      }
      element.set(field.wireName, std::move(converted));
    }
    elements.push_back(PlistValue::dictionary(std::move(element)));
  }
  return PlistValue::array(std::move(elements));
}

}  // namespace tbdaily
