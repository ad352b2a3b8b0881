// Units as the command line takes them.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace tbdaily {

// A code, decimal or 0x..., else the label that the library gives a unit: "ns", "MiB", "events". Nothing for
// another text.
std::optional<std::int64_t> parseUnit(const std::string& text);

}  // namespace tbdaily
