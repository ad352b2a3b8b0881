#include "platform/service_listener.h"

#include <algorithm>

#include "platform/hexadecimal.h"

namespace tbdaily {

std::int64_t messageInteger(const PlistDictionary& message, std::string_view field) {
  const PlistValue* value = message.find(field);
  return value != nullptr ? value->asInteger().value_or(0) : 0;
}

std::optional<std::string_view> messageText(const PlistDictionary& message, std::string_view field) {
  const PlistValue* value = message.find(field);
  return value != nullptr ? value->asString() : std::nullopt;
}

std::optional<UuidBytes> messageUuid(const PlistDictionary& message, std::string_view field) {
  const PlistValue* value = message.find(field);
  const auto data = value != nullptr ? value->asData() : std::nullopt;
  UuidBytes uuid;
  if (!data || data->size() != uuid.size()) return std::nullopt;
  std::copy(data->begin(), data->end(), uuid.begin());
  return uuid;
}

PlistValue messageValue(const PlistDictionary& message, std::string_view field) {
  return message.get(field);
}

void forEachElement(const PlistValue& array, const std::function<void(const PlistValue& element)>& visit) {
  const PlistArray* elements = array.asArray();
  if (elements == nullptr) return;
  for (const PlistValue& element : *elements) visit(element);
}

std::string uuidText(const UuidBytes& uuid) {
  std::string text;
  text.reserve(36);
  for (std::size_t i = 0; i < uuid.size(); ++i) {
    if (i == 4 || i == 6 || i == 8 || i == 10) text += '-';
    appendHexadecimal(text, std::span(uuid).subspan(i, 1), HexadecimalCase::Upper);
  }
  return text;
}

}  // namespace tbdaily
