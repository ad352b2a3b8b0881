// Days as people write and read them.
#pragma once

#include <string>
#include <string_view>

#include "platform/analytics_client.h"
#include "tools/tallyctl/outcome.h"

namespace tbdaily {

inline constexpr const char* kDayArgumentHelp =
    "2026-11-24, today, yesterday, -30 (so many days back), or days since 1970-01-01";

// The reason of a failure names the text and says what a day is.
Outcome<DayNumber> parseDay(std::string_view text, DayNumber today);

// "2026-11-24".
std::string dayText(DayNumber day);

}  // namespace tbdaily
