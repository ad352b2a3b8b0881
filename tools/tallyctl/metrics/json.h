// Channels and their values as JSON.
#pragma once

#include <vector>

#include "platform/plist/json_writer.h"
#include "tools/tallyctl/metrics/values.h"

namespace tbdaily {

// An array with an object for each channel; what is missing is null.
void writeChannels(JsonWriter& json, const std::vector<ChannelValues>& channels, ChannelContents contents);

}  // namespace tbdaily
