// Prints channels in the form that the user asked for.
#pragma once

#include <string>

#include "tools/tallyctl/metrics/selection.h"
#include "tools/tallyctl/metrics/values.h"
#include "tools/tallyctl/terminal.h"

namespace tbdaily {

class Tool;

// What all commands on channels are told.
struct MetricsRequest {
  ChannelFilter filter;
  bool describe = false;  // the library's own descriptions, and nothing else
};

// Whether there is nothing to print, which has then been said: no channel, or a selection that failed.
bool hasNothingToShow(Tool& tool, const MetricsRequest& request, const ChannelSelection& selection);

// The library's own descriptions one after another.
ShownText descriptionsText(const kdreport::ChannelCollection* collection, ChannelContents contents);

// As descriptions, JSON or a tree. A collection that cannot be walked is said to have failed.
void printChannels(Tool& tool, const MetricsRequest& request, const kdreport::ChannelCollection* collection,
                   ChannelContents contents);

}  // namespace tbdaily
