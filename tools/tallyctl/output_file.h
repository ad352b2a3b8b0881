// Files that the user wants something written to.
#pragma once

#include <cstddef>
#include <span>
#include <string>

#include "tools/tallyctl/outcome.h"

namespace tbdaily {

// A regular file appears whole or stays as it was, with the mode that the user's umask gives it; what else
// the path names (a pipe, a device) is written to, and "-" is standard output.
Outcome<Nothing> writeOutputFile(const std::string& path, std::span<const std::byte> bytes);

}  // namespace tbdaily
