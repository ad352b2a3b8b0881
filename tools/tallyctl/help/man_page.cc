#include "tools/tallyctl/help/man_page.h"

#include <array>
#include <string_view>
#include <utility>

#include "tools/tallyctl/help/command_tree.h"

namespace tbdaily {

namespace {

constexpr std::array<std::pair<std::string_view, std::string_view>, 7> kEnvironment{{
    {"TBDAILY_ROOT", "The device root where --root names none."},
    {"TBDAILY_LIVE", "0: only recordings answer, never this machine."},
    {"PAGER", "Shows what is longer than the screen; less where it is not set."},
    {"NO_COLOR", "Anything but empty: no colours."},
    {"TERM", "What the terminal can show; dumb: neither colours nor drawing characters."},
    {"LC_ALL, LC_CTYPE, LANG", "A UTF-8 locale has bars drawn in block characters."},
    {"COLUMNS", "How wide help is, where standard output is no terminal."},
}};

constexpr std::array<std::pair<std::string_view, std::string_view>, 3> kExitStatus{{
    {"0", "It is done."},
    {"1", "It failed, or what it looked at is not well; one line on standard error says why."},
    {"2", "The command line is wrong."},
}};

// Text for the formatter: no word of it is taken for a request or an escape.
std::string escaped(std::string_view text) {
  std::string safe;
  for (const char c : text) {
    if ((c == '.' || c == '\'') && (safe.empty() || safe.back() == '\n')) safe += "\\&";
    if (c == '\\')
      safe += "\\e";
    else if (c == '-')
      safe += "\\-";
    else
      safe += c;
  }
  return safe;
}

std::string bold(std::string_view text) {
  return "\\fB" + escaped(text) + "\\fR";
}

std::string sentence(std::string_view text) {
  return escaped(text) + (text.ends_with('.') ? "\n" : ".\n");
}

void addOptions(std::string& page, const std::vector<OptionDeclaration>& options) {
  for (const OptionDeclaration& option : options) {
    page += ".TP\n";
    std::string names;
    for (const std::string& name : option.names) names.append(names.empty() ? "" : ", ").append(bold(name));
    if (!option.isPositional && !option.value.empty()) names += " \\fI" + escaped(option.value) + "\\fR";
    page += names + (option.isPositional && option.isMany ? "..." : "") + "\n";
    page += option.says.empty() ? "\\&\n" : sentence(option.says);
  }
}

template <typename Rows>
void addTable(std::string& page, std::string_view heading, const Rows& rows) {
  page.append(".SH ").append(heading).append("\n");
  for (const auto& [name, says] : rows) page += ".TP\n" + bold(name) + "\n" + sentence(says);
}

void addCommand(std::string& page, const CLI::App& command) {
  page += ".SS " + bold(synopsisOf(command)) + "\n" + sentence(command.get_description());
  addOptions(page, optionsOf(command));
  for (const CLI::App* below : commandsOf(command)) addCommand(page, *below);
}

void addProgram(std::string& page, const CLI::App& program) {
  std::string group;
  page += ".SH COMMANDS\n";
  for (const CLI::App* command : commandsOf(program)) {
    if (command->get_group() != group) page += ".SS " + escaped(group = command->get_group()) + "\n";
    page += ".TP\n\\fB" + escaped(command->get_name()) + "\\fR(1)\n" + sentence(command->get_description());
  }
  page += ".PP\nThe page of each is \\fBtallyctl\\-\\fICOMMAND\\fR(1).\n";
}

}  // namespace

std::string manPageName(const CLI::App& command) {
  std::string name;
  for (const std::string& step : pathOf(command)) name.append(name.empty() ? "" : "-").append(step);
  return name;
}

std::string manPage(const CLI::App& command, const std::string& version) {
  const CLI::App& program = programOf(command);
  const std::string name = manPageName(command);
  std::string page =
      ".TH " + escaped(name) + " 1 \"\" \"tbdaily " + version + "\" \"User Commands\"\n.nh\n.ad l\n";
  page += ".SH NAME\n" + escaped(name) + " \\- " + escaped(command.get_description()) + "\n";
  page += ".SH SYNOPSIS\n" + bold(synopsisOf(command)) + "\n";
  page += ".SH DESCRIPTION\n" + sentence(command.get_description());
  if (&command == &program) {
    addProgram(page, program);
  } else if (const auto options = optionsOf(command); !options.empty()) {
    page += ".SH OPTIONS\n";
    addOptions(page, options);
  }
  if (const auto below = commandsOf(command); &command != &program && !below.empty()) {
    page += ".SH COMMANDS\n";
    for (const CLI::App* each : below) addCommand(page, *each);
  }
  page += ".SH OPTIONS OF ALL COMMANDS\n";
  addOptions(page, commonOptionsOf(program));
  addTable(page, "EXIT STATUS", kExitStatus);
  if (&command == &program) {
    addTable(page, "ENVIRONMENT", kEnvironment);
    page +=
        ".SH FILES\n.TP\n\\fI/etc/default/tbdaily\\fR\nLines NAME=VALUE; TBDAILY_ROOT there names the root "
        "where nothing "
        "else does.\n.TP\n\\fI/usr/share/tbdaily/schemas/\\fR\nA JSON Schema for what each command prints "
        "with "
        "\\-\\-json.\n";
  }
  return page + ".SH SEE ALSO\n" + (&command == &program ? "" : "\\fBtallyctl\\fR(1), ") +
         "\\fBtbdaily\\fR(8)\n";
}

}  // namespace tbdaily
