// Driver metrics as analytics keys.
#pragma once

#include "platform/platform.h"

namespace tbdaily {

// Sets one scalar, "com.velmora.kdreport." and the channel's name, for every simple channel that drivers
// publish in the category of the daily collection: its value at this moment. Channels without a name give
// none; of two with the same name the later one counts. Whatever is missing (channels, hub, sample) ends it
// without a word.
void CollectDriverMetricScalars(Platform& platform);

}  // namespace tbdaily
