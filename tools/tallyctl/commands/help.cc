// tallyctl help: the same as --help behind the command.

#include "tools/tallyctl/help/command_tree.h"
#include "tools/tallyctl/help/help_text.h"
#include "tools/tallyctl/help/mistyped.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

void addHelpCommand(CLI::App& app, Tool& tool) {
  CLI::App* command = app.add_subcommand("help", "Print the help of a command")->group("");
  auto words = std::make_shared<std::vector<std::string>>();
  command->add_option("COMMAND", *words, "A command, and one of its own where it has some");
  command->callback([&app, &tool, words] {
    const CLI::App* found = &app;
    for (const std::string& word : *words) {
      if (found != nullptr) found = commandNamed(*found, word);
    }
    if (found == nullptr) return tool.fail(unknownWord(app, *words), kWrongUsage);
    tool.out().print(ShownText::lines(helpText(*found, tool.out().width())));
  });
}

}  // namespace tbdaily
