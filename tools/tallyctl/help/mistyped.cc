#include "tools/tallyctl/help/mistyped.h"

#include <CLI/CLI.hpp>
#include <algorithm>

#include "tools/tallyctl/help/command_tree.h"

namespace tbdaily {

namespace {

// Letters to change, add or leave out, or to exchange with their neighbour.
std::size_t distance(std::string_view left, std::string_view right) {
  std::vector<std::size_t> before(right.size() + 1), above(right.size() + 1), row(right.size() + 1);
  for (std::size_t j = 0; j <= right.size(); ++j) above[j] = j;
  for (std::size_t i = 1; i <= left.size(); ++i) {
    row[0] = i;
    for (std::size_t j = 1; j <= right.size(); ++j) {
      const bool same = left[i - 1] == right[j - 1];
      row[j] = std::min({above[j] + 1, row[j - 1] + 1, above[j - 1] + (same ? 0 : 1)});
      if (i > 1 && j > 1 && left[i - 1] == right[j - 2] && left[i - 2] == right[j - 1])
        row[j] = std::min(row[j], before[j - 2] + 1);
    }
    before.swap(above);
    above.swap(row);
  }
  return above.back();
}

constexpr std::size_t kLongestWord = 64;  // more is not typed by mistake

std::string said(const std::string& what, const std::string& word,
                 const std::vector<std::string>& candidates) {
  const std::string similar = mostSimilar(word, candidates);
  return "there is no " + what + " \"" + word + "\"" +
         (similar.empty() ? "" : "; did you mean \"" + similar + "\"?");
}

std::vector<std::string> optionNames(const CLI::App& command, const CLI::App& program) {
  std::vector<std::string> names;
  for (const auto& options : {optionsOf(command), commonOptionsOf(program)}) {
    for (const OptionDeclaration& option : options) {
      if (!option.isPositional) names.insert(names.end(), option.names.begin(), option.names.end());
    }
  }
  return names;
}

// The option that is named, of the command or of one above it.
const CLI::Option* optionNamed(const CLI::App& command, const std::string& name) {
  for (const CLI::App* step = &command; step != nullptr; step = step->get_parent()) {
    if (const CLI::Option* option = step->get_option_no_throw(name);
        option != nullptr && !option->get_positional())
      return option;
  }
  return nullptr;
}

}  // namespace

std::string mostSimilar(std::string_view word, const std::vector<std::string>& candidates) {
  if (word.size() > kLongestWord) return {};
  std::string best;
  std::size_t least = std::max<std::size_t>(word.size() / 3, 1) + 1;
  for (const std::string& candidate : candidates) {
    const std::size_t changes = distance(word, candidate);
    // The beginning of a name is a name that was not typed to its end.
    const bool begins = word.size() > 2 && candidate.starts_with(word);
    if (changes < least || (begins && best.empty())) {
      best = candidate;
      least = begins ? least : changes;
    }
  }
  return best;
}

std::string unknownWord(const CLI::App& program, const std::vector<std::string>& words) {
  const CLI::App* command = &program;
  for (std::size_t i = 0; i < words.size(); ++i) {
    const std::string& word = words[i];
    if (word == "--") return {};
    if (word.size() > 1 && word[0] == '-' && !(word[1] >= '0' && word[1] <= '9')) {
      const std::string name = word.substr(0, word.starts_with("--") ? word.find('=') : 2);
      const CLI::Option* option = optionNamed(*command, name);
      if (option == nullptr) return said("option", name, optionNames(*command, program));
      const bool takesNext = option->get_items_expected_max() != 0 && word.find('=') == std::string::npos &&
                             (word.starts_with("--") || word.size() == 2);
      i += takesNext ? 1 : 0;
      continue;
    }
    const auto commands = commandsOf(*command);
    if (commands.empty()) continue;
    const CLI::App* below = commandNamed(*command, word);
    if (below == nullptr) {
      std::vector<std::string> names;
      for (const CLI::App* known : commands) names.push_back(known->get_name());
      const std::string path = command == &program ? "" : command->get_name() + " ";
      return said("command", path + word, [&] {
        for (std::string& name : names) name.insert(0, path);
        return names;
      }());
    }
    command = below;
  }
  return {};
}

}  // namespace tbdaily
