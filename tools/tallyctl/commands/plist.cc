// tallyctl plist: prints a property list of either encoding.

#include <CLI/CLI.hpp>

#include "platform/utf8.h"
#include "tools/tallyctl/input_file.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

void printPlist(Tool& tool, const std::string& path) {
  PropertyListCodec& codec = tool.platform().services().propertyListCodec;
  const auto value = readPlistFile(codec, path);
  if (!value) return tool.fail(value.reason());
  if (tool.printedAsJson(*value)) return;
  const PlistWriteResult written = codec.write(*value, PlistForm::Exact);
  if (!written.ok) return tool.fail(path + ": " + written.error);
  tool.out().print(ShownText::lines(withoutControls(written.bytes, TextPlace::Xml)));
}

}  // namespace

void addPlistCommand(CLI::App& app, Tool& tool) {
  CLI::App* command =
      app.add_subcommand("plist", "Print a property list of either encoding as XML, or with --json as JSON");
  auto file = std::make_shared<std::string>();
  command->add_option("FILE", *file, "The property list; - is standard input")->required();
  command->callback([&tool, file] { printPlist(tool, *file); });
}

}  // namespace tbdaily
