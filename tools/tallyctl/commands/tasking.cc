// tallyctl tasking: what is scheduled and applied; schedules and clears.

#include "driver/tasking.h"

#include <CLI/CLI.hpp>

#include "platform/device_answers.h"
#include "platform/linux/base/file_io.h"
#include "platform/log_submission.h"
#include "platform/plist_text.h"
#include "platform/preferences_store.h"
#include "tools/tallyctl/input_file.h"
#include "tools/tallyctl/tasking_check.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

constexpr std::string_view kScheduled = "ScheduledTasking";

PlistValue dictionaryOrNone(const PlistValue& value) {
  return value.asDictionary() != nullptr ? value : PlistValue();
}

// Everything that the tasking step of a run looks at.
struct TaskingState {
  explicit TaskingState(Platform& platform) {
    PreferencesStore& preferences = platform.preferences;
    const auto job = [&preferences](std::string_view key) {
      return preferences.getValue(key, preference_domain::kJob);
    };
    scheduled = preferences.getValue(kScheduled, preference_domain::kLogSubmission);
    id = job("TaskingID");
    os = job("TaskingOS");
    digest = job("TaskingDigest");
    payload = job("TaskingPayload");
    update = lastOSUpdate(preferences);
    days = aggressiveDays(platform.logSubmission.taskingValue(kAggressiveDaysKey));
    const std::int32_t elapsed = daysBetween(platform.analyticsClient.currentDayNumber(), update.day());
    // Without a scheduled tasking a run does not get as far as the submission.
    if (isScheduled() && elapsed >= 0 && elapsed < days) daysLeft = days - elapsed;
  }

  bool isScheduled() const { return scheduled.get("TaskingID").asString().has_value(); }

  PlistValue scheduled, id, os, digest, payload;
  OSUpdate update;
  std::int32_t days = 0;
  std::int32_t daysLeft = 0;
};

void writeState(JsonWriter& json, const TaskingState& state) {
  const auto root = json.object();
  json.add("scheduled", dictionaryOrNone(state.scheduled));
  if (state.id.isNone()) {
    json.add("applied", std::nullopt);
  } else {
    const auto applied = json.object("applied");
    json.add("id", state.id);
    json.add("os", state.os);
    json.add("digest", state.digest);
    json.add("payload", state.payload);
  }
  json.add("lastOSUpdate", dictionaryOrNone(state.update.record));
  json.add("aggressiveDays", state.days);
  json.add("aggressiveDaysLeft", state.daysLeft);
}

std::string shown(const PlistValue& value) {
  if (const auto boolean = value.asBoolean()) return *boolean ? "true" : "false";
  return value.isNone() ? "none" : plistText(value);
}

void printItems(Terminal& out, const PlistValue& payload) {
  if (payload.asArray() == nullptr) return out.line("  nothing: it has no payload");
  const std::vector<TaskingItem> items = taskingItems(*payload.asArray());
  Table table({Table::Align::Left, Table::Align::Left, Table::Align::Left});
  for (const TaskingItem& item : items) table.add({item.domain, item.key, shown(item.value)});
  table.print(out);
  const std::size_t malformed = payload.asArray()->size() - items.size();
  if (malformed != 0) out.line("  " + std::to_string(malformed) + " malformed items, which are skipped");
}

void print(Terminal& out, const TaskingState& state) {
  const auto entry = [&state](std::string_view key) { return state.scheduled.get(key); };
  if (state.scheduled.asDictionary() == nullptr) {
    out.line("No tasking is scheduled.");
  } else if (!state.isScheduled()) {
    out.line("The scheduled tasking has no TaskingID and is ignored.");
  } else {
    out.line(out.styled("Scheduled: " + shown(entry("TaskingID")), Style::Heading) + ", digest " +
             shown(entry("TaskingDigest")) + ". It sets:");
    printItems(out, entry("TaskingPayload"));
  }
  if (state.id.isNone()) {
    out.line("No tasking is applied.");
  } else {
    out.line(out.styled("Applied: " + shown(state.id), Style::Heading) + ", since OS build " +
             shown(state.os) + ", digest " + shown(state.digest) + ". It set:");
    printItems(out, state.payload);
  }
  const PlistValue version = state.update.version();
  out.line(version.isNone() ? "No OS update was seen yet."
                            : "The last OS update was to " + shown(version) + ", on day " +
                                  std::to_string(state.update.day()) + ".");
  out.line(state.days <= 0
               ? "Logs are not submitted early after an update."
               : "Logs are submitted at once on " + std::to_string(state.days) + " days from an update on; " +
                     std::to_string(state.daysLeft) + " of them are left.");
}

void show(Tool& tool) {
  if (!tool.hasUsableRoot()) return;
  const TaskingState state(tool.platform().services());
  if (!tool.hasReadAll()) return;
  if (!tool.printedAsJson([&state](JsonWriter& json) { writeState(json, state); })) print(tool.out(), state);
}

void storeScheduled(Tool& tool, const PlistValue& tasking) {
  PreferencesStore& preferences = tool.platform().services().preferences;
  preferences.setValue(kScheduled, tasking, preference_domain::kLogSubmission);
  preferences.synchronize(preference_domain::kLogSubmission);
  if (!(preferences.getValue(kScheduled, preference_domain::kLogSubmission) == tasking)) {
    return tool.fail("the tasking could not be written");
  }
  const auto write = [&tasking](JsonWriter& json) {
    const auto root = json.object();
    json.add("scheduled", tasking);
  };
  if (tool.printedAsJson(write)) return;
  tool.out().line(tasking.isNone() ? "no tasking is scheduled any more; what is applied stays"
                                   : "scheduled; the next run applies it");
}

void schedule(Tool& tool, const std::string& path) {
  if (!tool.hasUsableRoot()) return;
  const auto tasking = readPlistOrJsonFile(tool.platform().services().propertyListCodec, path);
  if (!tasking) return tool.fail(tasking.reason());
  if (const auto checked = checkTasking(*tasking); !checked) return tool.fail(path + ": " + checked.reason());
  storeScheduled(tool, *tasking);
}

}  // namespace

void addTaskingCommand(CLI::App& app, Tool& tool) {
  CLI::App* command = app.add_subcommand("tasking", "Look at the remote tasking, schedule one, or clear it");
  command->require_subcommand(1);
  command->add_subcommand("show", "Show what is scheduled and applied, and the days after an update")
      ->callback([&tool] { show(tool); });
  auto file = std::make_shared<std::string>();
  CLI::App* scheduling =
      command->add_subcommand("schedule", "Check a tasking and put it in place for the next run");
  scheduling
      ->add_option("FILE", *file,
                   "Property list or JSON: {TaskingID, TaskingDigest, TaskingPayload}; - is standard input")
      ->required();
  scheduling->callback([&tool, file] { schedule(tool, *file); });
  command->add_subcommand("clear", "Remove the scheduled tasking; what is applied stays")->callback([&tool] {
    if (tool.hasUsableRoot()) storeScheduled(tool, PlistValue());
  });
}

}  // namespace tbdaily
