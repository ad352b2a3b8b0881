// tallyctl nand: the NAND info dictionary of this moment, as a run would record it.

#include <CLI/CLI.hpp>
#include <algorithm>
#include <vector>

#include "driver/device_metrics.h"
#include "platform/diagnostics.h"
#include "platform/platform.h"
#include "platform/plist_text.h"
#include "storage/nand_info.h"
#include "tools/tallyctl/controller_buffer.h"
#include "tools/tallyctl/nand_glossary.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

// Groups in the order in which their first figure comes.
void printGrouped(Terminal& out, const PlistDictionary& info) {
  std::vector<std::string_view> groups;
  const auto groupOf = [](std::string_view key) {
    const NandGlossaryRow* row = findNandGlossary(key);
    return row != nullptr ? row->group : std::string_view("Other");
  };
  for (const auto& [key, value] : info) {
    if (std::find(groups.begin(), groups.end(), groupOf(key)) == groups.end()) groups.push_back(groupOf(key));
  }
  using enum Table::Align;
  for (const std::string_view group : groups) {
    out.line(out.styled(group, Style::Heading));
    Table table({Left, Right, Left});
    for (const auto& [key, value] : info) {
      if (groupOf(key) != group) continue;
      const NandGlossaryRow* row = findNandGlossary(key);
      const auto number = value.asNumber();
      table.add({key, plistText(value),
                 row != nullptr && number ? humanNandFigure(row->unit, number->toInt64()) : ""});
    }
    table.print(out);
  }
}

void explain(Tool& tool, const std::string& key) {
  const auto sentence = explainNandKey(key);
  if (!sentence)
    return tool.fail("the NAND info has no figure \"" + key + "\"; tallyctl nand lists those of this device");
  if (tool.printedAsJson(PlistValue::dictionary(
          {{"key", PlistValue::string(key)}, {"meaning", PlistValue::string(*sentence)}}))) {
    return;
  }
  tool.out().line(*sentence);
}

void showNand(Tool& tool) {
  if (!tool.hasUsableRoot()) return;
  QuietDiagnostics quiet;
  Platform services = platformWith(tool.platform().services(), quiet);
  const PlistDictionary info = currentNANDInfo(services);
  if (!tool.hasReadAll()) return;
  if (info.contains(kNANDInfoErrorKey)) {
    return tool.fail("the NAND info cannot be had: " + plistText(info.get(kNANDInfoErrorMessageKey)));
  }
  if (tool.printedAsJson(PlistValue::dictionary(info))) return;
  printGrouped(tool.out(), info);
}

}  // namespace

void addNandCommand(CLI::App& app, Tool& tool) {
  CLI::App* command =
      app.add_subcommand("nand", "Show the NAND info of this moment, as a run would record it");
  auto key = std::make_shared<std::string>();
  command->add_option("--explain", *key, "Say in one sentence what a figure means")->type_name("FIGURE");
  command->callback([&tool, key] { key->empty() ? showNand(tool) : explain(tool, *key); });
}

}  // namespace tbdaily
