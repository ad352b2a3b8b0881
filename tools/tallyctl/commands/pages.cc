// Writes the companion's manual pages and completions: tallyctl_pages FOLDER, which then has man/, bash/,
// zsh/ and fish/.

#include <cstdio>
#include <filesystem>
#include <fstream>

#include "tools/tallyctl/commands/declare.h"
#include "tools/tallyctl/help/command_tree.h"
#include "tools/tallyctl/help/completion.h"
#include "tools/tallyctl/help/man_page.h"

namespace {

bool write(const std::filesystem::path& place, const std::string& text) {
  std::error_code error;
  std::filesystem::create_directories(place.parent_path(), error);
  std::ofstream file(place, std::ios::binary);
  file << text;
  return file.flush().good();
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 2) {
    std::fputs("usage: tallyctl_pages FOLDER\n", stderr);
    return 2;
  }
  const std::filesystem::path folder = argv[1];
  tbdaily::Tool tool;
  CLI::App program;
  tbdaily::declareCommands(program, tool);
  bool isWritten = write(folder / "man" / "tallyctl.1", tbdaily::manPage(program, TBDAILY_VERSION));
  for (const CLI::App* command : tbdaily::commandsOf(program))
    isWritten &= write(folder / "man" / (tbdaily::manPageName(*command) + ".1"),
                       tbdaily::manPage(*command, TBDAILY_VERSION));
  isWritten &= write(folder / "bash" / "tallyctl", completionScript(program, tbdaily::Shell::Bash)) &&
               write(folder / "zsh" / "_tallyctl", completionScript(program, tbdaily::Shell::Zsh)) &&
               write(folder / "fish" / "tallyctl.fish", completionScript(program, tbdaily::Shell::Fish));
  if (!isWritten) std::fprintf(stderr, "tallyctl_pages: %s cannot be written\n", folder.c_str());
  return isWritten ? 0 : 1;
}
