// Manual pages, from the declarations of the commands.
#pragma once

#include <CLI/CLI.hpp>
#include <string>

namespace tbdaily {

// "tallyctl-metrics" of a command below the program, "tallyctl" of the program itself.
std::string manPageName(const CLI::App& command);

// The page, as the man macros of groff have it. That of a command has its subcommands too; that of the
// program lists all commands, and says what holds for each: files, environment, exit status.
std::string manPage(const CLI::App& command, const std::string& version);

}  // namespace tbdaily
