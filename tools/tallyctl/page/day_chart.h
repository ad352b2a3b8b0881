// Values over days as lines.
#pragma once

#include <string_view>
#include <vector>

#include "platform/calendar.h"
#include "tools/tallyctl/page/html.h"

namespace tbdaily {

struct DayPoint {
  DayNumber day = 0;
  double value = 0;       // finite
  bool isJoined = false;  // with the point before it, by a line
};

struct DayLine {
  Markup name;
  std::vector<DayPoint> points;  // ascending
};

struct DayChart {
  Markup name;
  std::string_view unit;  // of the values; empty for none
  bool isWhole = false;   // values are never broken
  bool fromZero = true;
  std::vector<DayLine> lines = {};    // at most two; the second is dashed
  std::vector<DayNumber> marks = {};  // days that are marked by an upright line
};

// An image whose accessible name says what it shows and of which days; above it a legend where there are
// several lines. From the first day of all charts to the last, so that they can be compared.
void writeDayChart(HtmlWriter& page, const DayChart& chart, DayNumber first, DayNumber last);

}  // namespace tbdaily
