// App records as people write them, and as a message carries them.
#pragma once

#include <string>

#include "platform/plist_value.h"

namespace tbdaily {

struct AppRecords {
  PlistValue elements;  // the array for "app_data"; none on failure
  std::string error;    // names the record and the field; empty on success
};

// Takes an array of dictionaries with the fields of a message ("bundle_id", "version", "kestrel_id", "arch",
// "uuid") or of a report
// ("bundle", "kestrelID"); the UUID is 16 bytes of data or its 36-character text.
AppRecords appRecordsForMessage(const PlistValue& value);

}  // namespace tbdaily
