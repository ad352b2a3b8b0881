// A distribution's histogram as a drawing and as a table.
#pragma once

#include <span>
#include <string_view>

#include "tools/tallyctl/page/html.h"
#include "tools/tallyctl/report/daily_report.h"

namespace tbdaily {

// An image whose accessible name holds the key: one bar for each bucket that is not empty, as high as its
// count, all of one width and in the order of their bounds; a gap leaves its place free. Nothing for no
// buckets.
void writeHistogramDrawing(HtmlWriter& page, std::string_view key, std::span<const HistogramBucket> buckets);

// Lower and upper bound and count of each bucket that is not empty.
void writeHistogramTable(HtmlWriter& page, std::string_view key, std::span<const HistogramBucket> buckets);

}  // namespace tbdaily
