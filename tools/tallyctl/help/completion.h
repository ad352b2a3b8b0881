// Completion for shells, from the declarations of the commands.
#pragma once

#include <CLI/CLI.hpp>
#include <string>

namespace tbdaily {

enum class Shell : std::uint8_t { Bash, Zsh, Fish };

// A script that completes commands, options and their values. Values that only the device knows are asked for
// when they are needed, with "tallyctl complete KIND".
std::string completionScript(const CLI::App& program, Shell shell);

}  // namespace tbdaily
