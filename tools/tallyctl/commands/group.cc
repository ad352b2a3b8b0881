// tallyctl group: the whitelist's groups, and which of them are switched off.

#include <CLI/CLI.hpp>
#include <algorithm>

#include "platform/file_system.h"
#include "platform/platform.h"
#include "platform/preferences_store.h"
#include "platform/property_list_codec.h"
#include "report/internal_device.h"
#include "report/tb_config.h"
#include "tools/tallyctl/help/mistyped.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

struct Group {
  std::string name;
  bool isOn;
};

// In the whitelist's order; nothing, with the reason said, when it cannot be read.
std::optional<std::vector<Group>> groupsOf(Tool& tool) {
  Platform& platform = tool.platform().services();
  const auto bytes = platform.fileSystem.readFile(kWhitelistPath);
  if (!tool.hasReadAll()) return std::nullopt;
  if (!bytes) {
    tool.fail("there is no whitelist at " + std::string(kWhitelistPath));
    return std::nullopt;
  }
  const PlistParseResult parsed = platform.propertyListCodec.parse(*bytes);
  const PlistDictionary* root = parsed.value.asDictionary();
  if (root == nullptr) {
    tool.fail("the whitelist " + std::string(kWhitelistPath) +
              " cannot be read: " + (parsed.error.empty() ? "its root is no dictionary" : parsed.error));
    return std::nullopt;
  }
  std::vector<Group> groups;
  for (const auto& [name, entries] : *root) {
    const PreferenceBoolean enabled =
        platform.preferences.getBoolean(name, preference_domain::kTaskingValues);
    groups.push_back({name, enabled.value || !enabled.valid});
  }
  if (!tool.hasReadAll()) return std::nullopt;
  return groups;
}

void show(Tool& tool) {
  if (!tool.hasUsableRoot()) return;
  const auto groups = groupsOf(tool);
  if (!groups) return;
  const auto write = [&groups](JsonWriter& json) {
    const auto root = json.array();
    for (const Group& group : *groups) {
      const auto entry = json.object();
      json.add("group", group.name);
      json.add("on", group.isOn);
    }
  };
  if (tool.printedAsJson(write)) return;
  Terminal& out = tool.out();
  Table table({Table::Align::Left, Table::Align::Left});
  for (const Group& group : *groups)
    table.add({group.name, out.styled(group.isOn ? "on" : "off", group.isOn ? Style::Good : Style::Bad)});
  table.print(out);
  if (groups->empty()) out.line("the whitelist has no groups");
  if (TBIsInternalDevice(tool.platform().services().deviceAnswers))
    out.line("the device runs an internal build: all groups hold, whatever is switched off");
}

void set(Tool& tool, const std::string& name, bool isOn) {
  if (!tool.hasUsableRoot()) return;
  const auto groups = groupsOf(tool);
  if (!groups) return;
  if (std::ranges::find(*groups, name, &Group::name) == groups->end()) {
    std::vector<std::string> names;
    for (const Group& group : *groups) names.push_back(group.name);
    const std::string similar = mostSimilar(name, names);
    return tool.fail("the whitelist has no group \"" + name + "\"" +
                     (similar.empty() ? "" : "; did you mean \"" + similar + "\"?"));
  }
  PreferencesStore& preferences = tool.platform().services().preferences;
  preferences.setValue(name, PlistValue::boolean(isOn), preference_domain::kTaskingValues);
  preferences.synchronize(preference_domain::kTaskingValues);
  const PreferenceBoolean stored = preferences.getBoolean(name, preference_domain::kTaskingValues);
  if (!stored.valid || stored.value != isOn) return tool.fail("the switch of the group could not be written");
  show(tool);
}

}  // namespace

void addGroupCommand(CLI::App& app, Tool& tool) {
  CLI::App* command =
      app.add_subcommand("group", "The whitelist's groups, and what a tasking or somebody here switched off");
  command->require_subcommand(1);
  command->add_subcommand("show", "Show each group, and whether its keys may be reported")->callback([&tool] {
    show(tool);
  });
  auto name = std::make_shared<std::string>();
  for (const bool isOn : {true, false}) {
    CLI::App* change = command->add_subcommand(
        isOn ? "on" : "off", isOn ? "Let the keys of a group be reported" : "Keep the keys of a group here");
    change->add_option("GROUP", *name, "A group of the whitelist")->required()->type_name("SWITCH");
    change->callback([&tool, name, isOn] { set(tool, *name, isOn); });
  }
}

}  // namespace tbdaily
