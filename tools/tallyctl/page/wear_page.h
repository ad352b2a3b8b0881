// Wear over days as a page.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "tools/tallyctl/wear/wear_history.h"

namespace tbdaily {

struct WearPageSubject {
  std::string device;                           // what the history is of, as the reader knows it
  std::optional<WearPace> pace;                 // of the last days of the history
  std::optional<std::int64_t> enduranceCycles;  // erases that a block is made for; above 0
};

// One HTML file that needs nothing else; the same history and subject give the same bytes.
std::string wearPage(const WearHistory& history, const WearPageSubject& subject);

}  // namespace tbdaily
