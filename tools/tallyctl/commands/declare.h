// All commands of the companion.
#pragma once

#include <CLI/CLI.hpp>

#include "tools/tallyctl/tool.h"

namespace tbdaily {

// Declares the options that all commands take, and each command in its group. Borrows the tool.
void declareCommands(CLI::App& program, Tool& tool);

}  // namespace tbdaily
