// tallyctl init: makes a complete sample device.

#include <CLI/CLI.hpp>

#include "tools/tallyctl/sample/device.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

void makeDevice(Tool& tool, const std::string& profileName) {
  if (!tool.namesRoot()) {
    return tool.fail("name the folder to make the device in: tallyctl init --root DIR (or set TBDAILY_ROOT)",
                     kWrongUsage);
  }
  const SampleProfile* profile = nullptr;
  for (const SampleProfile& candidate : kSampleProfiles) {
    if (profileName == candidate.name) profile = &candidate;
  }
  if (profile == nullptr)
    return tool.fail("there is no profile \"" + profileName + "\"; choose nvme or stx", kWrongUsage);
  const auto made = makeSampleDevice(tool.platform(), *profile);
  if (!made) return tool.fail(made.reason());
  const std::string root = tool.platform().host().root().native();
  const auto write = [&](JsonWriter& json) {
    const auto object = json.object();
    json.add("root", root);
    json.add("profile", profile->name);
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
  auto profile = std::make_shared<std::string>("nvme");
  command->add_option("--profile", *profile, "The device's storage controller: nvme (default) or stx")
      ->type_name("NAME");
  command->callback([&tool, profile] { makeDevice(tool, *profile); });
}

}  // namespace tbdaily
