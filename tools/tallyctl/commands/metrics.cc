// tallyctl metrics: the channels that drivers publish, and their values.

#include <CLI/CLI.hpp>
#include <cmath>

#include "platform/linux/live/channel_meanings.h"
#include "platform/number_text.h"
#include "tools/tallyctl/metrics/advance.h"
#include "tools/tallyctl/metrics/sampler.h"
#include "tools/tallyctl/metrics/watch.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

using namespace kdreport;

namespace {

void list(Tool& tool, const MetricsRequest& request) {
  const ChannelSelection selection = selectChannels(tool, request.filter);
  if (!hasNothingToShow(tool, request, selection))
    printChannels(tool, request, selection.channels.get(), ChannelContents::Description);
}

void sample(Tool& tool, const MetricsRequest& request) {
  const ChannelSelection selection = selectChannels(tool, request.filter);
  if (hasNothingToShow(tool, request, selection)) return;
  ChannelSampler sampler(tool, *selection.channels);
  if (!sampler) return;
  if (const KdReportCollection samples = sampler.sample())
    printChannels(tool, request, samples.get(), ChannelContents::Values);
}

std::string_view whyNotScaled(std::int64_t from, std::int64_t to) {
  return KdReportUnitGetQuantity(from) != KdReportUnitGetQuantity(to)
             ? "the two units measure different quantities"
             : "a scale of the units has no number";
}

void scale(Tool& tool, const std::vector<std::string>& words) {
  const auto value = words[0].starts_with('-') ? std::nullopt : parseCode(words[0]);
  if (!value) {
    return tool.fail("\"" + words[0] + "\" is no unsigned 64-bit number, decimal or 0x...", kWrongUsage);
  }
  std::array<std::int64_t, 2> units{};
  for (std::size_t i = 0; i < units.size(); ++i) {
    const auto code = parseCode(words[i + 1]);
    if (!code)
      return tool.fail("\"" + words[i + 1] + "\" is no unit code, a 64-bit number, decimal or 0x...",
                       kWrongUsage);
    units[i] = static_cast<std::int64_t>(*code);
  }
  const double scaled = KdReportScaleValue(*value, units[0], units[1]);
  if (tool.printedAsJson(PlistValue::dictionary({{"value", PlistValue::float64(scaled)}}))) return;
  tool.out().line(realText(scaled));
  if (!std::isfinite(scaled)) {
    printError("the value cannot be converted: " + std::string(whyNotScaled(units[0], units[1])));
  }
}

void explain(Tool& tool, const std::string& name) {
  const auto meaning = channelMeaning(name);
  if (!meaning)
    return tool.fail("nothing is known about the channel \"" + name +
                     "\"; tallyctl metrics list shows those that there are");
  if (tool.printedAsJson(PlistValue::dictionary(
          {{"name", PlistValue::string(name)}, {"explanation", PlistValue::string(std::string(*meaning))}})))
    return;
  tool.out().line(std::string(*meaning));
}

void requireUsable(bool usable, const std::string& option, const std::string& expected) {
  if (!usable) throw CLI::ValidationError(option, "expected " + expected);
}

// A command on channels, with the options that all of these share.
template <typename Run>
CLI::App* addChannelCommand(CLI::App& metrics, Tool& tool, const std::string& name, const std::string& says,
                            Run run) {
  CLI::App* command = metrics.add_subcommand(name, says);
  auto request = std::make_shared<MetricsRequest>();
  ChannelFilter& filter = request->filter;
  command->add_option("--driver", filter.driver, "Channels of the driver with this display name, name or id")
      ->type_name("DRIVER");
  command->add_option("--group", filter.group, "Channels of this group")->type_name("GROUP");
  command->add_option("--subgroup", filter.subGroup, "Channels of this subgroup")->type_name("SUBGROUP");
  command
      ->add_option_function<std::string>(
          "--category",
          [request](const std::string& text) {
            requireUsable(setCategories(request->filter, text), "--category", "a mask, decimal or 0x...");
          },
          "Channels of any category of the mask")
      ->type_name("MASK");
  command
      ->add_option_function<std::string>(
          "--format",
          [request](const std::string& text) {
            requireUsable(setFormat(request->filter, text), "--format",
                          "unknown, simple, state, histogram, array, or a number");
          },
          "Channels of this format: unknown, simple, state, histogram, array, or its number")
      ->type_name("FORMAT");
  command
      ->add_option_function<std::string>(
          "--unit", [request](const std::string& text) { setUnit(request->filter, text); },
          "Channels with this unit code, or label such as ns")
      ->type_name("UNIT");
  command->add_flag("--describe", request->describe,
                    "Print the metrics library's own descriptions and nothing else");
  command->callback([&tool, request, run] {
    if (request->describe && tool.options.json)
      return tool.fail("--describe prints texts of its own and does not go with --json", kWrongUsage);
    if (tool.hasUsableRoot()) run(*request);
  });
  return command;
}

// `least` is the shortest interval; a watch without any would never rest.
void addInterval(CLI::App* command, const std::shared_ptr<double>& interval, double least) {
  command
      ->add_option_function<double>(
          "--interval",
          [interval, least](double seconds) {
            requireUsable(seconds >= least && seconds <= 86400, "--interval",
                          "seconds from " + realText(least) + " to 86400");
            *interval = seconds;
          },
          "Seconds from one sample to the next")
      ->type_name("S")
      ->required();
}

void addDelta(CLI::App& metrics, Tool& tool) {
  auto interval = std::make_shared<double>(0.0);
  addInterval(addChannelCommand(metrics, tool, "delta", "Show what changes within an interval",
                                [&tool, interval](const MetricsRequest& request) {
                                  runMetricsDelta(tool, request, *interval);
                                }),
              interval, 0);
}

void addWatch(CLI::App& metrics, Tool& tool) {
  auto interval = std::make_shared<double>(0.0);
  auto count = std::make_shared<std::uint64_t>(std::uint64_t{0});
  CLI::App* command = addChannelCommand(
      metrics, tool, "watch", "Show a sample every so often, until interrupted: one line for each when piped",
      [&tool, interval, count](const MetricsRequest& request) {
        runMetricsWatch(tool, request, *interval, *count);
      });
  addInterval(command, interval, 0.001);
  command->add_option("--count", *count, "End after so many samples")
      ->type_name("N")
      ->check(CLI::PositiveNumber);
}

void addScale(CLI::App& metrics, Tool& tool) {
  CLI::App* command = metrics.add_subcommand("scale", "Convert a value from one unit to another");
  auto words = std::make_shared<std::vector<std::string>>(3);
  command->add_option("VALUE", (*words)[0], "An unsigned number, decimal or 0x...")->required();
  command->add_option("FROM", (*words)[1], "Its unit code, decimal or 0x...")->required();
  command->add_option("TO", (*words)[2], "The unit code to convert to")->required();
  command->callback([&tool, words] { scale(tool, *words); });
}

void addAdvance(CLI::App& metrics, Tool& tool) {
  CLI::App* command = metrics.add_subcommand("advance", "Move the recorded hub's values on");
  auto seconds = std::make_shared<std::uint64_t>(std::uint64_t{1});
  command->add_option("--seconds", *seconds, "By so many seconds, 1 unless given")
      ->type_name("S")
      ->check(CLI::Range(std::int64_t{1}, std::int64_t{1'000'000'000}));
  command->callback([&tool, seconds] { advanceMetrics(tool, *seconds); });
}

}  // namespace

void addMetricsCommand(CLI::App& app, Tool& tool) {
  CLI::App* metrics = app.add_subcommand("metrics", "Look at the channels of drivers and their values");
  metrics->require_subcommand(0, 1);
  auto name = std::make_shared<std::string>();
  metrics
      ->add_option("--explain", *name, "Say in one sentence what a channel of this machine's drivers means")
      ->type_name("CHANNEL");
  metrics->callback([&tool, metrics, name] {
    if (!name->empty()) return explain(tool, *name);
    if (metrics->get_subcommands().empty())
      tool.fail("say what to show: list, sample, delta, watch, scale or advance (tallyctl metrics --help)",
                kWrongUsage);
  });
  addChannelCommand(*metrics, tool, "list", "Show the channels that drivers publish",
                    [&tool](const MetricsRequest& request) { list(tool, request); });
  addChannelCommand(*metrics, tool, "sample", "Show the values of this moment",
                    [&tool](const MetricsRequest& request) { sample(tool, request); });
  addDelta(*metrics, tool);
  addWatch(*metrics, tool);
  addScale(*metrics, tool);
  addAdvance(*metrics, tool);
}

}  // namespace tbdaily
