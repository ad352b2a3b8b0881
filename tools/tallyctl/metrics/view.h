// Channels and their values as text for people.
#pragma once

#include <string>
#include <vector>

#include "platform/plist_value.h"
#include "tools/tallyctl/metrics/values.h"
#include "tools/tallyctl/terminal.h"

namespace tbdaily {

// A tree by driver, group and subgroup, with what is known of each channel.
void printChannelTree(Terminal& out, const std::vector<ChannelValues>& channels);

// The same tree with the values.
void printValueTree(Terminal& out, const std::vector<ChannelValues>& channels);

// "driver/group/subgroup/name"; the identifier in place of a missing name.
std::string wholeName(const ChannelValues& channel);

// One line: the time, then "name=value unit" of each channel, two spaces apart. Of a state channel the value
// is the current state, of a histogram the number of hits. Of a name that several channels have the
// whole is written.
std::string valuesLine(PlistDate time, const std::vector<ChannelValues>& channels);

}  // namespace tbdaily
