// The samples of a watch as rows of a screen.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "tools/tallyctl/metrics/values.h"

namespace tbdaily {

struct WatchRow {
  bool isHeading = false;  // of the channels below it: a driver, or a group of it
  std::string name;
  std::string figure, human, rate;  // of a channel with a number: in its unit, as people say it, each second
  // Of another one: its current state in brackets and its states by their share of the time, or its values.
  std::string shares;
};

// What was taken before, so many seconds ago; none for a first sample.
struct EarlierSample {
  std::vector<ChannelValues> channels;
  double secondsAgo = 0;
};

// The channels that have the text in their whole name, in whatever case, below their headings. Shares are
// those of the time since the earlier sample, else of all time.
std::vector<WatchRow> watchRows(const std::vector<ChannelValues>& channels, const EarlierSample& earlier,
                                std::string_view filter);

}  // namespace tbdaily
