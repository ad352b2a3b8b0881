// tallyctl: makes, feeds, drives and shows a tbdaily device.

#include <CLI/CLI.hpp>
#include <algorithm>
#include <exception>
#include <string>
#include <vector>

#include "platform/linux/base/process_start.h"
#include "tools/tallyctl/commands/declare.h"
#include "tools/tallyctl/help/help_text.h"
#include "tools/tallyctl/help/mistyped.h"

namespace {

using tbdaily::Tool;

// The words of the command line in the reverse order that the parser takes. It would take the word behind an
// empty value, as in "--unit=", for that value: the two are handed over apart.
std::vector<std::string> reversedWords(int argc, char** argv) {
  std::vector<std::string> words;
  bool isOption = true;  // until "--"
  for (int i = 1; i < argc; ++i) {
    std::string word = argv[i];
    isOption = isOption && word != "--";
    const bool hasEmptyValue = isOption && word.starts_with("--") && word.find('=') == word.size() - 1;
    if (hasEmptyValue) word.pop_back();
    words.push_back(std::move(word));
    if (hasEmptyValue) words.emplace_back();
  }
  std::ranges::reverse(words);
  return words;
}

}  // namespace

int main(int argc, char** argv) {
  tbdaily::prepareProcess();
  Tool tool;
  CLI::App app;
  try {
    app.formatter(
        std::make_shared<tbdaily::HelpFormatter>(tool.out().width()));  // also of the commands below
    tbdaily::declareCommands(app, tool);
    app.parse_complete_callback([&tool] { tool.mayPage(); });
    app.parse(reversedWords(argc, argv));
  } catch (const CLI::Success& asked) {  // --help
    return app.exit(asked);
  } catch (const CLI::ParseError& error) {
    // What the parser says of a command that it does not know names everything but the command.
    const std::string unknown = tbdaily::unknownWord(app, {argv + 1, argv + argc});
    tool.fail((unknown.empty() ? error.what() : unknown) + " (try --help)", tbdaily::kWrongUsage);
  } catch (const std::exception& failure) {
    tool.fail(failure.what());
  }
  if (!tool.out().finish() && tool.exitStatus == tbdaily::kDone)
    tool.fail("standard output cannot be written");
  return tool.exitStatus;
}
