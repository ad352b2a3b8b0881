// tallyctl consent: whether logs may leave this device.

#include <CLI/CLI.hpp>

#include "platform/platform.h"
#include "platform/preferences_store.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

void show(Tool& tool) {
  if (!tool.hasUsableRoot()) return;
  const bool consent =
      tool.platform().services().preferences.getBoolean(kConsentKey, preference_domain::kLogSubmission).value;
  if (!tool.hasReadAll()) return;
  if (tool.printedAsJson(PlistValue::dictionary({{"consent", PlistValue::boolean(consent)}}))) return;
  tool.out().line(consent
                      ? "on: reports are written, and what is submitted may leave this device"
                      : "off: no report is written, other logs are withheld, and nothing leaves this device");
}

void set(Tool& tool, bool consent) {
  if (!tool.hasUsableRoot()) return;
  PreferencesStore& preferences = tool.platform().services().preferences;
  preferences.setValue(kConsentKey, PlistValue::boolean(consent), preference_domain::kLogSubmission);
  preferences.synchronize(preference_domain::kLogSubmission);
  const PreferenceBoolean stored = preferences.getBoolean(kConsentKey, preference_domain::kLogSubmission);
  if (!stored.valid || stored.value != consent) return tool.fail("the consent could not be written");
  show(tool);
}

}  // namespace

void addConsentCommand(CLI::App& app, Tool& tool) {
  CLI::App* command = app.add_subcommand("consent", "Whether logs may leave this device");
  command->require_subcommand(1);
  command->add_subcommand("show", "Say whether they may")->callback([&tool] { show(tool); });
  command->add_subcommand("on", "Let them leave, from now on; what was withheld stays")->callback([&tool] {
    set(tool, true);
  });
  command->add_subcommand("off", "Keep them here; nothing is written for submission any more")
      ->callback([&tool] { set(tool, false); });
}

}  // namespace tbdaily
