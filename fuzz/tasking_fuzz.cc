// Taskings: consent stays what the device's owner said, and one that was applied changes nothing more.
#include "driver/tasking.h"
#include "fuzz/plist_input.h"
#include "platform/preferences_store.h"
#include "testing/fake_platform.h"

using namespace tbdaily;
using fuzz::Input;
using fuzz::require;

namespace {

constexpr std::array<std::string_view, 18> kWords = {"TaskingID",
                                                     "TaskingDigest",
                                                     "TaskingPayload",
                                                     "Domain",
                                                     "Key",
                                                     "Value",
                                                     "ScheduledTasking",
                                                     "TaskingOS",
                                                     "LastOSUpdate",
                                                     "version",
                                                     "day",
                                                     "4N117",
                                                     preference_domain::kJob,
                                                     preference_domain::kTaskingValues,
                                                     preference_domain::kLogSubmission,
                                                     kConsentKey,
                                                     kAggressiveDaysKey,
                                                     "Network"};

// A tasking in its proper shape, around what the input says of it.
PlistValue taskingOf(Input& input) {
  PlistArray payload;
  for (std::size_t count = input.below(5); count > 0; --count) {
    PlistDictionary item;
    item.set("Domain", PlistValue::string(input.wordOrText(kWords)));
    item.set("Key", PlistValue::string(input.wordOrText(kWords)));
    if (input.flag()) item.set("Value", PlistValue::int64(input.integer()));
    payload.push_back(PlistValue::dictionary(std::move(item)));
  }
  return PlistValue::dictionary({{"TaskingID", PlistValue::string(input.wordOrText(kWords))},
                                 {"TaskingPayload", PlistValue::array(std::move(payload))}});
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Input input(data, size);
  testing::FakePlatform fake;
  auto& domains = fake.preferences.domains;
  // What was applied last, and what is to be applied now.
  domains[std::string(preference_domain::kJob)] =
      (input.flag() ? taskingOf(input) : fuzz::plistOfSection(input, kWords)).mutableDictionary();
  PlistDictionary& submission = domains[std::string(preference_domain::kLogSubmission)];
  submission = fuzz::plistOfSection(input, kWords).mutableDictionary();
  if (input.flag()) fake.deviceAnswers.build = input.wordOrText(kWords);
  fake.analyticsClient.today = input.number<DayNumber>();
  fake.logSubmission.taskingValues.set(kAggressiveDaysKey, fuzz::plistOfSection(input, kWords));
  const PlistValue scheduled = input.flag() ? taskingOf(input) : fuzz::plistOf(input, kWords);
  if (scheduled.asDictionary() != nullptr) submission.set("ScheduledTasking", scheduled);

  const PlistValue consent = submission.get(kConsentKey);
  HandleTaskingAndOSChange(fake.platform);
  require(submission.get(kConsentKey) == consent, "a tasking neither gives nor takes consent");
  require(fake.logSubmission.calls.size() <= 1, "logs are submitted once");
  for (const auto& [domain, values] : domains) {
    for (const auto& [key, value] : values) require(!value.isNone(), "no key without a value");
  }

  // What a tasking says of the job's own notes may well have it applied again.
  const PlistValue id = fake.preferences.getValue("TaskingID", preference_domain::kJob);
  const PlistValue os = fake.preferences.getValue("TaskingOS", preference_domain::kJob);
  const PlistValue next = submission.get("ScheduledTasking").get("TaskingID");
  const bool isApplied = id.asString() && id == next && fake.deviceAnswers.build &&
                         os.asString() == std::string_view(*fake.deviceAnswers.build) &&
                         lastOSUpdate(fake.preferences).version() == os;
  fake.preferences.writes.clear();
  HandleTaskingAndOSChange(fake.platform);
  require(!isApplied || fake.preferences.writes.empty(), "a tasking that was applied changes nothing more");
  return 0;
}
