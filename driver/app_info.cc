#include "driver/app_info.h"

#include "platform/uuid.h"

namespace tbdaily {

namespace {

// None when the element does not hold all five fields.
PlistValue appInfoRecord(const PlistValue& element) {
  const PlistValue bundle = element.get("bundle_id");
  const PlistValue version = element.get("version");
  const auto kestrelID = element.get("kestrel_id").asInteger();
  const auto arch = element.get("arch").asInteger();
  const PlistValue uuidData = element.get("uuid");
  const auto uuid = uuidData.asData() ? uuidOf(*uuidData.asData()) : std::nullopt;
  if (!bundle.asString() || !version.asString() || !kestrelID || !arch || !uuid) return {};
  return PlistValue::dictionary({{"bundle", bundle},
                                 {"version", version},
                                 {"kestrelID", PlistValue::int64(*kestrelID)},
                                 {"arch", PlistValue::int64(*arch)},
                                 {"uuid", PlistValue::string(uuidText(*uuid))}});
}

}  // namespace

PlistValue appInfoFromMessage(const PlistValue& message) {
  PlistArray records;
  const PlistValue elements = message.get("app_data");
  if (const PlistArray* list = elements.asArray()) {
    for (const PlistValue& element : *list) {
      PlistValue record = appInfoRecord(element);
      if (!record.isNone()) records.push_back(std::move(record));
    }
  }
  return PlistValue::array(std::move(records));
}

}  // namespace tbdaily
