// The driver metrics of the sample device: what the drivers of a phone would publish, and the hub's values
// for it.
#pragma once

#include "platform/plist_value.h"

namespace tbdaily {

// Registry entries: the hub's service, and drivers whose legends are public.
PlistArray sampleMetricsEntries();

// The root of hub.plist: each channel of those legends, three days after the device started.
PlistDictionary sampleHub();

}  // namespace tbdaily
