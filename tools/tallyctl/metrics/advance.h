// What `tallyctl metrics advance` runs.
#pragma once

#include <cstdint>

namespace tbdaily {

class Tool;

// Moves the values of the recorded hub on by so many seconds, as a device's would, and says how many channels
// moved. One line with the reason, and nothing written, when there is no hub to move.
void advanceMetrics(Tool& tool, std::uint64_t seconds);

}  // namespace tbdaily
