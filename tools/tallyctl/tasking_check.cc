#include "tools/tallyctl/tasking_check.h"

#include <algorithm>
#include <array>

#include "driver/tasking.h"
#include "platform/linux/base/file_io.h"

namespace tbdaily {

namespace {

constexpr std::array<std::string_view, 3> kEntries = {"TaskingID", "TaskingDigest", "TaskingPayload"};

std::optional<std::string> itemFault(const PlistValue& element) {
  if (element.asDictionary() == nullptr) return "is no dictionary";
  const PlistValue domain = element.get("Domain");
  const PlistValue key = element.get("Key");
  if (!domain.asString()) return "has no text as \"Domain\"";
  if (!isSafeName(*domain.asString())) {
    return "has a \"Domain\" that is none: 1 to 200 letters, digits, '.', '-' or '_', not beginning with '.'";
  }
  if (!key.asString() || key.asString()->empty()) return "has no text as \"Key\"";
  if (element.get("Value").isNone()) return "has no \"Value\"";
  if (isConsent({*domain.asString(), *key.asString(), {}}))
    return "says whether logs may leave the device, which no tasking can: it would be left out";
  return std::nullopt;
}

}  // namespace

Outcome<Nothing> checkTasking(const PlistValue& tasking) {
  const PlistDictionary* root = tasking.asDictionary();
  if (root == nullptr) return Failure{"a tasking is a dictionary"};
  const PlistValue id = root->get("TaskingID");
  if (!id.asString() || id.asString()->empty()) return Failure{"a tasking needs a text as \"TaskingID\""};
  for (const auto& [name, value] : *root) {
    if (std::find(kEntries.begin(), kEntries.end(), name) == kEntries.end()) {
      return Failure{"a tasking has no entry \"" + name +
                     "\"; it has \"TaskingID\", \"TaskingDigest\" and \"TaskingPayload\""};
    }
  }
  const PlistValue* payload = root->find("TaskingPayload");
  if (payload == nullptr) return Nothing{};
  if (payload->asArray() == nullptr) return Failure{"\"TaskingPayload\" is an array of items"};
  for (std::size_t i = 0; i < payload->asArray()->size(); ++i) {
    if (const auto fault = itemFault((*payload->asArray())[i]))
      return Failure{"item " + std::to_string(i + 1) + " of the payload " + *fault};
  }
  return Nothing{};
}

}  // namespace tbdaily
