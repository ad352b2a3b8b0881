// Channels and their values as tables for people.
#pragma once

#include <vector>

#include "tools/tallyctl/metrics/values.h"
#include "tools/tallyctl/terminal.h"

namespace tbdaily {

// A tree by driver, group and subgroup, with what is known of each channel.
void printChannelTree(Terminal& out, const std::vector<ChannelValues>& channels);

// The same tree with the values: in their units, and as people say them.
void printValueTree(Terminal& out, const std::vector<ChannelValues>& channels);

// What changed between two samples so many seconds apart, of it the states and buckets that did, with rates;
// and how many channels there are.
void printChanges(Terminal& out, std::vector<ChannelValues> delta, double seconds);

}  // namespace tbdaily
