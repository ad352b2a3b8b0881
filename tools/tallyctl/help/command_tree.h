// The companion's commands as their declarations have them: what help, man pages and completions are made
// from.
#pragma once

#include <string>
#include <vector>

namespace CLI {
class App;
class Option;
}  // namespace CLI

namespace tbdaily {

struct OptionDeclaration {
  std::vector<std::string> names;  // "-o", "--output"; of a positional its one name
  std::string value;               // what stands for its value: "FILE"; empty for a flag
  std::string says;
  bool isPositional = false, isRequired = false, isMany = false;
};

// Of the command itself, without what all commands share, in the order in which they were declared.
std::vector<OptionDeclaration> optionsOf(const CLI::App& command);
// What all commands take: --root, --json, --no-pager, --help.
std::vector<OptionDeclaration> commonOptionsOf(const CLI::App& program);
// Its commands that are shown.
std::vector<const CLI::App*> commandsOf(const CLI::App& command);
// The command below it of that name, shown or not; null when there is none.
const CLI::App* commandNamed(const CLI::App& command, const std::string& name);

// "tallyctl metrics sample [OPTIONS] ...", the names of its parents before it.
std::string synopsisOf(const CLI::App& command);
// The names from the program's down to the command's.
std::vector<std::string> pathOf(const CLI::App& command);
const CLI::App& programOf(const CLI::App& command);

// "-o, --output FILE", or "KEY..." of a positional.
std::string shownNames(const OptionDeclaration& option);

}  // namespace tbdaily
