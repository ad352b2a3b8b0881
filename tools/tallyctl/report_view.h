// A daily report as a person reads it.
#pragma once

#include "platform/plist_value.h"
#include "tools/tallyctl/terminal.h"

namespace tbdaily {

// Prints the report's root dictionary; what is missing or of another kind is passed over.
void printReport(Terminal& out, const PlistDictionary& root);

}  // namespace tbdaily
