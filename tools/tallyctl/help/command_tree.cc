#include "tools/tallyctl/help/command_tree.h"

#include <CLI/CLI.hpp>
#include <algorithm>

namespace tbdaily {

namespace {

// A check shows its choices behind the type: what is said of the option has them.
std::string typeOf(const CLI::Option& option) {
  const std::string type = option.get_type_name();
  return type.substr(0, type.find_first_of(": "));
}

OptionDeclaration declarationOf(const CLI::Option& option) {
  OptionDeclaration declaration;
  declaration.isPositional = option.get_positional();
  declaration.isRequired = option.get_required();
  declaration.says = option.get_description();
  if (declaration.isPositional) {
    declaration.names = {option.get_name(true)};
    declaration.value = typeOf(option);
    // The parser's own names of types say nothing.
    for (const std::string_view type : {"TEXT", "INT", "UINT", "FLOAT"}) {
      if (declaration.value == type) declaration.value = declaration.names.front();
    }
    declaration.isMany = option.get_items_expected_max() > 1;
    return declaration;
  }
  for (const std::string& name : option.get_snames()) declaration.names.push_back("-" + name);
  for (const std::string& name : option.get_lnames()) declaration.names.push_back("--" + name);
  if (option.get_type_size() != 0) declaration.value = typeOf(option);
  return declaration;
}

std::vector<OptionDeclaration> declarationsOf(const CLI::App& command) {
  std::vector<OptionDeclaration> declarations;
  for (const CLI::Option* option : command.get_options()) {
    if (!option->get_group().empty()) declarations.push_back(declarationOf(*option));
  }
  return declarations;
}

bool isHelp(const OptionDeclaration& option) {
  return std::ranges::find(option.names, "--help") != option.names.end();
}

}  // namespace

std::vector<OptionDeclaration> optionsOf(const CLI::App& command) {
  if (command.get_parent() == nullptr) return {};
  std::vector<OptionDeclaration> options = declarationsOf(command);
  std::erase_if(options, isHelp);
  return options;
}

std::vector<OptionDeclaration> commonOptionsOf(const CLI::App& program) {
  std::vector<OptionDeclaration> options = declarationsOf(program);
  // As the last of them.
  std::ranges::stable_partition(options, [](const OptionDeclaration& option) { return !isHelp(option); });
  return options;
}

std::vector<const CLI::App*> commandsOf(const CLI::App& command) {
  return command.get_subcommands([](const CLI::App* below) { return !below->get_group().empty(); });
}

const CLI::App* commandNamed(const CLI::App& command, const std::string& name) {
  const auto found =
      command.get_subcommands([&name](const CLI::App* below) { return below->get_name() == name; });
  return found.empty() ? nullptr : found.front();
}

const CLI::App& programOf(const CLI::App& command) {
  const CLI::App* program = &command;
  while (program->get_parent() != nullptr) program = program->get_parent();
  return *program;
}

std::vector<std::string> pathOf(const CLI::App& command) {
  std::vector<std::string> path;
  for (const CLI::App* step = &command; step != nullptr; step = step->get_parent())
    path.insert(path.begin(), step->get_name());
  return path;
}

std::string shownNames(const OptionDeclaration& option) {
  std::string shown;
  for (const std::string& name : option.names) shown.append(shown.empty() ? "" : ", ").append(name);
  if (option.isPositional) return shown.append(option.isMany ? "..." : "");
  return option.value.empty() ? shown : shown + " " + option.value;
}

std::string synopsisOf(const CLI::App& command) {
  std::string synopsis;
  for (const std::string& step : pathOf(command)) synopsis.append(synopsis.empty() ? "" : " ").append(step);
  const std::vector<OptionDeclaration> options = optionsOf(command);
  bool hasOthers = false;
  for (const OptionDeclaration& option : options) {
    if (option.isPositional) continue;
    if (option.isRequired)
      synopsis += " " + option.names.back() + " " + option.value;
    else
      hasOthers = true;
  }
  synopsis += hasOthers || options.empty() ? " [OPTIONS]" : "";
  for (const OptionDeclaration& option : options) {
    if (!option.isPositional) continue;
    synopsis += option.isRequired ? " " + shownNames(option) : " [" + shownNames(option) + "]";
  }
  if (!commandsOf(command).empty())
    synopsis += command.get_require_subcommand_min() > 0 ? " COMMAND" : " [COMMAND]";
  return synopsis;
}

}  // namespace tbdaily
