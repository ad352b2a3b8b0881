// Channels and their values as JSON.
#pragma once

#include <vector>

#include "platform/plist_value.h"
#include "tools/tallyctl/metrics/values.h"

namespace tbdaily {

// An array with a dictionary for each channel; what is missing is null.
PlistValue channelsAsJson(const std::vector<ChannelValues>& channels, ChannelContents contents);

}  // namespace tbdaily
