// Completion for shells, from the declarations of the commands.
#pragma once

#include <CLI/CLI.hpp>
#include <array>
#include <string>
#include <string_view>

namespace tbdaily {

enum class Shell : std::uint8_t { Bash, Zsh, Fish };

// A script that completes commands, options and their values. Values that only the device knows are asked for
// when they are needed, with "tallyctl complete KIND".
std::string completionScript(const CLI::App& program, Shell shell);

// What completes the value of an option or argument, by the name that stands for it in the help.
struct ValueKind {
  std::string_view value;  // "DRIVER"
  std::string_view kind;   // as "complete" takes it; "files" and "folders" are the shell's own
};
extern const std::array<ValueKind, 16> kValueKinds;
// Empty when there is none.
std::string_view completionKindOf(std::string_view value);

}  // namespace tbdaily
