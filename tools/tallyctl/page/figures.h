// Figures of a page as people read them, each with the whole one for programs.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "tools/tallyctl/page/html.h"

namespace tbdaily {

// "1,234,567".
std::string groupedDigits(std::int64_t value);
// "1.2M", or with a unit "1.2 MB", for the scale of a chart: three digits at most. `value` is finite.
std::string scaleText(double value, std::string_view unit);

// Digits in groups; <data value="1234567"> holds those without.
void writeFigure(HtmlWriter& page, std::int64_t value);
// Six significant digits, in groups; where these are not all, or the value is not finite, <data> holds the
// shortest text that reads back to it.
void writeFigure(HtmlWriter& page, double value);
// The figure under another text of it: "4.20 TB".
void writeFigureAs(HtmlWriter& page, double value, std::string_view text);

// "2.50".
std::string twoDecimals(double value);
// Sizes of drives, in powers of 1000 as their makers count: "4.20 TB". `bytes` is not negative.
std::string driveSizeText(double bytes);

}  // namespace tbdaily
