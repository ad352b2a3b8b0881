// tallyctl complete: what a shell may put in place of a value; for the completion scripts.

#include <CLI/CLI.hpp>
#include <array>
#include <set>

#include "platform/linux/base/host.h"
#include "platform/linux/linux_notifications.h"
#include "tools/tallyctl/controller_buffer.h"
#include "tools/tallyctl/export/report_rows.h"
#include "tools/tallyctl/help/command_tree.h"
#include "tools/tallyctl/metrics/selection.h"
#include "tools/tallyctl/metrics/values.h"
#include "tools/tallyctl/nand_glossary.h"
#include "tools/tallyctl/tool.h"
#include "tools/tallyctl/whitelist_review.h"

namespace tbdaily {

namespace {

// Each once, those of the device in its order.
using Words = std::vector<std::string>;

template <typename Word>
Words channelWords(Tool& tool, const Word& word) {
  Words words;
  std::set<std::string> seen;
  const ChannelSelection selection = selectChannels(tool, {});
  if (!selection.channels) return words;
  const auto channels = readChannels(selection.channels.get(), ChannelContents::Description);
  for (const ChannelValues& channel : channels.value_or(std::vector<ChannelValues>())) {
    const std::optional<std::string> found = word(channel);
    if (found && !found->empty() && seen.insert(*found).second) words.push_back(*found);
  }
  return words;
}

Words drivers(Tool& tool) {
  return channelWords(tool, [](const ChannelValues& channel) {
    return channel.driver ? std::optional(channel.driver->substr(0, channel.driver->rfind(" <id ")))
                          : std::nullopt;
  });
}
Words groups(Tool& tool) {
  return channelWords(tool, [](const ChannelValues& channel) { return channel.group; });
}
Words subGroups(Tool& tool) {
  return channelWords(tool, [](const ChannelValues& channel) { return channel.subGroup; });
}
Words channels(Tool& tool) {
  return channelWords(tool, [](const ChannelValues& channel) { return channel.name; });
}
Words units(Tool& tool) {
  return channelWords(tool, [](const ChannelValues& channel) { return channel.unitLabel; });
}

Words formats(Tool&) {
  Words words;
  for (std::uint8_t format = 0; format < 5; ++format) words.push_back(formatName(format));
  return words;
}

Words exportFormats(Tool&) {
  return {"tsv", "ndjson", "prometheus"};
}
Words exportTables(Tool&) {
  Words words;
  for (const ExportTableDescription& table : kExportTables) words.emplace_back(table.name);
  return words;
}

const PlistDictionary noEntries;

// Calls with each group of the whitelist.
template <typename Visit>
void visitWhitelist(Tool& tool, const Visit& visit) {
  const PlistValue root = whitelistRoot(tool.platform().services());
  const PlistDictionary* groups = root.asDictionary();
  if (groups == nullptr) return;
  for (const auto& [name, entries] : *groups) visit(name, entries);
}

Words switches(Tool& tool) {
  Words words;
  visitWhitelist(tool, [&words](const std::string& name, const PlistValue&) { words.push_back(name); });
  return words;
}

Words keys(Tool& tool) {
  Words words;
  visitWhitelist(tool, [&words](const std::string&, const PlistValue& entries) {
    for (const std::string_view table : {"ScalarKeys", "DistributionKeys"}) {
      const PlistValue list = entries.get(table);
      for (const auto& [key, options] : list.asDictionary() != nullptr ? *list.asDictionary() : noEntries)
        words.push_back(key);
    }
  });
  return words;
}

Words figures(Tool&) {
  return nandGlossaryKeys();
}
Words buffers(Tool&) {
  Words words;
  for (const BufferKind& kind : kBufferKinds) words.emplace_back(kind.name);
  return words;
}
Words recordings(Tool&) {
  return {"registry", "nvme", "answers", "kernel", "apps", "locale", "clock"};
}
Words days(Tool&) {
  return {"today", "yesterday", "-7", "-30"};
}

Words notifications(Tool& tool) {
  DeviceFolder folder;
  Words words;
  if (tool.platform().host().files().openFolder(LinuxNotifications::kFolder, folder) == 0)
    folder.names(words);
  std::erase_if(words, [](const std::string& name) { return name.starts_with('.'); });
  return words;
}

struct Kind {
  std::string_view name;
  Words (*words)(Tool& tool);
};
constexpr std::array<Kind, 15> kKinds{{{"drivers", drivers},
                                       {"groups", groups},
                                       {"subgroups", subGroups},
                                       {"channels", channels},
                                       {"units", units},
                                       {"formats", formats},
                                       {"exports", exportFormats},
                                       {"tables", exportTables},
                                       {"switches", switches},
                                       {"keys", keys},
                                       {"figures", figures},
                                       {"buffers", buffers},
                                       {"recordings", recordings},
                                       {"days", days},
                                       {"notifications", notifications}}};

}  // namespace

void addCompleteCommand(CLI::App& app, Tool& tool) {
  CLI::App* command =
      app.add_subcommand("complete", "Print what may stand for a value, for shells")->group("");
  auto kind = std::make_shared<std::string>();
  command->add_option("KIND", *kind)->required();
  command->callback([&app, &tool, kind] {
    if (*kind == "commands") {
      for (const CLI::App* known : commandsOf(app)) tool.out().line(known->get_name());
      return;
    }
    for (const Kind& known : kKinds) {
      if (known.name != *kind) continue;
      for (const std::string& word : known.words(tool)) tool.out().line(word);
      return;
    }
    tool.fail("there is no kind \"" + *kind + "\"", kWrongUsage);
  });
}

}  // namespace tbdaily
