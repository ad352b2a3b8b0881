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
#include "tools/tallyctl/help/help_text.h"
#include "tools/tallyctl/key_selection.h"
#include "tools/tallyctl/nand_glossary.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

using enum Table::Align;
constexpr std::string_view kOther = "Other";

std::string_view groupOf(std::string_view key) {
  const NandGlossaryRow* row = findNandGlossary(key);
  return row != nullptr ? row->group : kOther;
}

// The ranges of one histogram as bars, up to the last one that is not empty.
void printHistogram(Terminal& out, const NandGlossaryRow& row, const PlistDictionary& info) {
  std::vector<std::int64_t> counts;
  for (const auto& [key, value] : info) {
    const auto number = findNandGlossary(key) == &row ? nandSeriesNumber(row, key) : std::nullopt;
    if (!number) continue;
    counts.resize(std::max(counts.size(), *number + 1));
    counts[*number] = value.asInteger().value_or(0);
  }
  while (!counts.empty() && counts.back() == 0) counts.pop_back();
  out.line("  " + std::string(row.base));
  if (counts.empty()) return out.line("      all ranges are empty");
  const std::size_t width = std::to_string(counts.size() - 1).size();
  std::vector<BarRow> rows;
  rows.reserve(counts.size());
  for (std::size_t i = 0; i < counts.size(); ++i) {
    const std::string number = std::to_string(i);
    rows.push_back({"range " + std::string(width - number.size(), ' ') + number, counts[i]});
  }
  printBars(out, rows);
}

void printGroup(Terminal& out, std::string_view group, const PlistDictionary& info) {
  out.line(out.styled(std::string(group), Style::Heading));
  Table table({Left, Right, Left});
  table.add({"figure", "value", ""});
  std::vector<const NandGlossaryRow*> histograms;
  bool hasFigures = false;
  for (const auto& [key, value] : info) {
    if (groupOf(key) != group) continue;
    const NandGlossaryRow* row = findNandGlossary(key);
    if (row != nullptr && isNandHistogram(*row)) {
      if (std::find(histograms.begin(), histograms.end(), row) == histograms.end()) histograms.push_back(row);
      continue;
    }
    const auto number = value.asNumber();
    table.add({std::string(withoutNandPrefix(key)), plistText(value),
               row != nullptr && number ? humanNandFigure(row->unit, number->toInt64()) : ""});
    hasFigures = true;
  }
  if (hasFigures) table.print(out);
  for (const NandGlossaryRow* row : histograms) printHistogram(out, *row, info);
}

// Groups in the order in which their first figure comes.
void printGrouped(Terminal& out, const PlistDictionary& info) {
  std::vector<std::string_view> groups;
  for (const auto& [key, value] : info) {
    if (std::find(groups.begin(), groups.end(), groupOf(key)) == groups.end()) groups.push_back(groupOf(key));
  }
  for (const std::string_view group : groups) {
    if (group != groups.front()) out.line();
    printGroup(out, group, info);
  }
}

void explainGroup(Tool& tool, const std::vector<const NandGlossaryRow*>& rows) {
  const auto write = [&rows](JsonWriter& json) {
    const auto figures = json.array();
    for (const NandGlossaryRow* row : rows) {
      const auto entry = json.object();
      json.add("key", row->base);
      json.add("meaning", row->sentence);
    }
  };
  if (tool.printedAsJson(write)) return;
  tool.mayPage();
  constexpr std::size_t kIndent = 4;
  for (const NandGlossaryRow* row : rows) {
    tool.out().line("  " + std::string(row->base));
    tool.out().print(ShownText::lines(std::string(kIndent, ' ') +
                                      wrappedText(row->sentence, kIndent, tool.out().width())));
  }
}

void explain(Tool& tool, const std::string& key) {
  if (const auto rows = nandGlossaryGroup(key); !rows.empty()) return explainGroup(tool, rows);
  const auto sentence = explainNandKey(key);
  if (!sentence) {
    std::string groups;
    for (const std::string_view group : nandGlossaryGroups())
      groups.append(groups.empty() ? "" : ", ").append(group);
    return tool.fail("the NAND info has no figure \"" + key +
                     "\"; tallyctl nand lists those of this device; groups are " + groups);
  }
  if (tool.printedAsJson(PlistValue::dictionary(
          {{"key", PlistValue::string(key)}, {"meaning", PlistValue::string(*sentence)}}))) {
    return;
  }
  tool.out().line(*sentence);
}

void showNand(Tool& tool, const std::vector<std::string>& words) {
  if (!tool.hasUsableRoot()) return;
  QuietDiagnostics quiet;
  Platform services = platformWith(tool.platform().services(), quiet);
  PlistDictionary info = currentNANDInfo(services);
  if (!tool.hasReadAll()) return;
  if (info.contains(kNANDInfoErrorKey)) {
    return tool.fail("the NAND info cannot be had: " + plistText(info.get(kNANDInfoErrorMessageKey)));
  }
  info.removeIf([&words](std::string_view key) {
    return !isSelected(withoutNandPrefix(key), words) && (words.empty() || !isSelected(groupOf(key), words));
  });
  if (info.empty() && !words.empty()) return tool.fail("no figure has that in its name: " + words.front());
  if (tool.printedAsJson(PlistValue::dictionary(info))) return;
  tool.mayPage();
  printGrouped(tool.out(), info);
}

}  // namespace

void addNandCommand(CLI::App& app, Tool& tool) {
  CLI::App* command =
      app.add_subcommand("nand", "Show the NAND info of this moment, as a run would record it");
  auto key = std::make_shared<std::string>();
  auto words = std::make_shared<std::vector<std::string>>();
  CLI::Option* explained =
      command
          ->add_option("--explain", *key,
                       "Say in one sentence what a figure means, or each figure of a group")
          ->type_name("FIGURE");
  command
      ->add_option("FIGURE", *words,
                   "Only figures that have one of the words in their names, or their group's")
      ->excludes(explained);
  command->callback([&tool, key, words] { key->empty() ? showNand(tool, *words) : explain(tool, *key); });
}

}  // namespace tbdaily
