#include "driver/app_info.h"

#include "platform/service_listener.h"

namespace tbdaily {

namespace {

// None when the element does not hold all five fields.
PlistValue appInfoRecord(const PlistValue& element) {
  const PlistDictionary* app = element.asDictionary();
  if (app == nullptr) return {};
  const auto bundle = messageText(*app, "bundle_id");
  const auto version = messageText(*app, "version");
  const auto kestrelID = messageValue(*app, "kestrel_id").asInteger();
  const auto arch = messageValue(*app, "arch").asInteger();
  const auto uuid = messageUuid(*app, "uuid");
  if (!bundle || !version || !kestrelID || !arch || !uuid) return {};
  return PlistValue::dictionary({{"bundle", PlistValue::string(std::string(*bundle))},
                                 {"version", PlistValue::string(std::string(*version))},
                                 {"kestrelID", PlistValue::int64(*kestrelID)},
                                 {"arch", PlistValue::int64(*arch)},
                                 {"uuid", PlistValue::string(uuidText(*uuid))}});
}

}  // namespace

PlistValue appInfoFromMessage(const PlistDictionary& message) {
  PlistArray records;
  forEachElement(messageValue(message, "app_data"), [&records](const PlistValue& element) {
    PlistValue record = appInfoRecord(element);
    if (!record.isNone()) records.push_back(std::move(record));
  });
  return PlistValue::array(std::move(records));
}

}  // namespace tbdaily
