// App records as people write them, and as a message carries them.
#pragma once

#include <string>

#include "platform/plist_value.h"
#include "tools/tallyctl/outcome.h"

namespace tbdaily {

// Takes an array of dictionaries with the fields of a message ("bundle_id", "version", "kestrel_id", "arch",
// "uuid") or of a report
// ("bundle", "kestrelID"); the UUID is 16 bytes of data or its 36-character text.
Outcome<PlistValue> appRecordsForMessage(const PlistValue& value);

}  // namespace tbdaily
