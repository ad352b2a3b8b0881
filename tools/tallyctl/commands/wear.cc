// tallyctl wear: how much the flash is worn, and what the controller recommends.

#include <CLI/CLI.hpp>

#include "platform/number_text.h"
#include "storage/content_deletion.h"
#include "storage/storage_connection.h"
#include "storage/write_amplification.h"
#include "tools/tallyctl/controller_buffer.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

// Statistics that are shown where the controller has them.
constexpr std::string_view kWearStats[] = {"percentUsed", "slcPercentUsed", "maxHighEnduranceBlockErases",
                                           "bandErases", "intermediateBandErases"};

PlistDictionary wearStats(const StatsContext& context) {
  PlistDictionary found;
  for (const StatNode& node : context.nodes) {
    for (const std::string_view name : kWearStats) {
      if (node.isNamed(name)) found.set(name, PlistValue::int64(static_cast<std::int64_t>(node.value)));
    }
  }
  return found;
}

std::string figure(double value) {
  return realText(static_cast<float>(value));
}

void showWear(Tool& tool) {
  if (!tool.hasUsableRoot()) return;
  Platform& platform = tool.platform().services();
  QuietDiagnostics quiet;
  const FetchedStats stats(platform.driverRegistry, quiet);
  if (!tool.hasReadAll()) return;
  if (!stats) return tool.fail("the controller's statistics cannot be had");
  const WriteAmplification amplification = computeWriteAmplification(stats.context());
  const auto preferred = preferredWriteAmplificationThreshold(platform.preferences);
  const double threshold = preferred ? static_cast<double>(*preferred) : kDefaultWriteAmplificationThreshold;
  const bool above = isAboveThreshold(amplification.user, platform.preferences);
  const bool recommends = NandRecommendsContentDeletion(platform.driverRegistry, quiet);
  const PlistDictionary found = wearStats(stats.context());
  if (!tool.hasReadAll()) return;

  PlistDictionary json{{"userWriteAmplification", PlistValue::float64(amplification.user)},
                       {"systemWriteAmplification", PlistValue::float64(amplification.system)},
                       {"threshold", PlistValue::float64(threshold)},
                       {"aboveThreshold", PlistValue::boolean(above)},
                       {"recommendsContentDeletion", PlistValue::boolean(recommends)}};
  for (const auto& [name, value] : found) json.set(name, value);
  if (tool.printedAsJson(PlistValue::dictionary(json))) return;

  Terminal& out = tool.out();
  out.line(out.styled("Write amplification", Style::Heading));
  Table table({Table::Align::Left, Table::Align::Right});
  table.add({"user", figure(amplification.user)});
  table.add({"system", figure(amplification.system)});
  table.add({"threshold", figure(threshold)});
  table.print(out);
  out.line(above ? out.styled("  above the threshold: a run writes the NAND log", Style::Bad)
                 : "  not above the threshold: a run writes no NAND log");
  out.line(out.styled("Wear", Style::Heading));
  Table wear({Table::Align::Left, Table::Align::Right});
  for (const auto& [name, value] : found) wear.add({name, std::to_string(value.asInteger().value_or(0))});
  wear.print(out);
  out.line(recommends ? "The controller recommends that content be deleted."
                      : "The controller recommends no deletion of content.");
}

}  // namespace

void addWearCommand(CLI::App& app, Tool& tool) {
  app.add_subcommand("wear", "Show write amplification, erase counts and what the controller recommends")
      ->callback([&tool] { showWear(tool); });
}

}  // namespace tbdaily
