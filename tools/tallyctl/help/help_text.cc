#include "tools/tallyctl/help/help_text.h"

#include <algorithm>
#include <map>
#include <vector>

#include "tools/tallyctl/help/command_tree.h"

namespace tbdaily {

namespace {

constexpr std::size_t kWidestNames = 26, kMargin = 2;

using Entries = std::vector<std::pair<std::string, std::string>>;  // names, and what is said of them

void addEntries(std::string& text, const std::string& heading, const Entries& entries, std::size_t width) {
  if (entries.empty()) return;
  std::size_t names = 0;
  for (const auto& [name, says] : entries) {
    if (name.size() <= kWidestNames) names = std::max(names, name.size());
  }
  text += "\n" + heading + ":\n";
  const std::size_t indentation = kMargin + names + 2;
  for (const auto& [name, says] : entries) {
    text.append(kMargin, ' ').append(name);
    if (name.size() > names)
      text.append("\n").append(indentation, ' ');
    else
      text.append(indentation - kMargin - name.size(), ' ');
    text += wrappedText(says, indentation, width);
  }
}

std::string saysOf(const OptionDeclaration& option) {
  if (!option.isRequired || option.isPositional) return option.says;
  return option.says + " (required)";
}

}  // namespace

std::string wrappedText(std::string_view text, std::size_t indentation, std::size_t width) {
  const std::size_t room = std::max<std::size_t>(width > indentation ? width - indentation : 0, 20);
  std::string lines;
  std::size_t column = 0;
  while (!text.empty()) {
    const std::string_view word = text.substr(0, text.find(' '));
    text.remove_prefix(std::min(text.size(), word.size() + 1));
    if (word.empty()) continue;
    if (column != 0 && column + 1 + word.size() > room) {
      lines.append("\n").append(indentation, ' ');
      column = 0;
    }
    if (column != 0) lines += ' ', ++column;
    lines += word;
    column += word.size();
  }
  return lines + "\n";
}

std::string helpText(const CLI::App& command, std::size_t width) {
  std::string text = "Usage: " + wrappedText(synopsisOf(command), 7, width);
  text += "\n" + wrappedText(command.get_description() + ".", 0, width);
  Entries positionals, options, common;
  for (const OptionDeclaration& option : optionsOf(command))
    (option.isPositional ? positionals : options).emplace_back(shownNames(option), saysOf(option));
  for (const OptionDeclaration& option : commonOptionsOf(programOf(command)))
    common.emplace_back(shownNames(option), saysOf(option));
  std::vector<std::string> order;
  std::map<std::string, Entries> groups;
  for (const CLI::App* below : commandsOf(command)) {
    if (!groups.contains(below->get_group())) order.push_back(below->get_group());
    groups[below->get_group()].emplace_back(below->get_name(), below->get_description());
  }
  for (const std::string& group : order) addEntries(text, group, groups[group], width);
  addEntries(text, "Arguments", positionals, width);
  addEntries(text, "Options", options, width);
  addEntries(text, "Options of all commands", common, width);
  if (!order.empty())
    text += "\n" + wrappedText("\"tallyctl help COMMAND\" and \"COMMAND --help\" say more of one.", 0, width);
  return text;
}

}  // namespace tbdaily
