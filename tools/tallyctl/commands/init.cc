// tallyctl init: makes a complete sample device.

#include <CLI/CLI.hpp>

#include "tools/tallyctl/sample/device.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

struct InitArguments {
  std::string profile = "nvme";
  std::uint64_t seed = 0;
  int days = 1;
};

void makeDevice(Tool& tool, const InitArguments& arguments) {
  if (!tool.namesRoot()) {
    return tool.fail("name the folder to make the device in: tallyctl init --root DIR (or set TBDAILY_ROOT)",
                     kWrongUsage);
  }
  SampleRequest request{nullptr, SampleVariation::ofSeed(arguments.seed), arguments.days};
  for (const SampleProfile& candidate : kSampleProfiles) {
    if (arguments.profile == candidate.name) request.profile = &candidate;
  }
  if (request.profile == nullptr)
    return tool.fail("there is no profile \"" + arguments.profile + "\"; choose nvme or stx", kWrongUsage);
  const auto made = makeSampleDevice(tool.platform(), request);
  if (!made) return tool.fail(made.reason());
  const std::string root = tool.platform().host().root().native();
  const auto write = [&](JsonWriter& json) {
    const auto object = json.object();
    json.add("root", root);
    json.add("profile", request.profile->name);
  };
  if (tool.printedAsJson(write)) return;
  tool.out().line("made a sample device in " + root);
  tool.out().line("run its day with: TBDAILY_ROOT=" + root + " tbdaily -f");
  tool.out().line("and look at it with: tallyctl --root " + root + " report");
}

}  // namespace

void addInitCommand(CLI::App& app, Tool& tool) {
  CLI::App* command =
      app.add_subcommand("init", "Make a complete sample device in the root; refuses to overwrite anything");
  auto arguments = std::make_shared<InitArguments>();
  command
      ->add_option("--profile", arguments->profile, "The device's storage controller: nvme (default) or stx")
      ->type_name("NAME");
  command
      ->add_option("--seed", arguments->seed,
                   "Another device: of another age, used more or less (default: 0, the sample device)")
      ->type_name("N");
  command->add_option("--days", arguments->days, "So many days of history, up to yesterday (default: 1)")
      ->type_name("N")
      ->check(CLI::Range(1, 3650));
  command->callback([&tool, arguments] { makeDevice(tool, *arguments); });
}

}  // namespace tbdaily
