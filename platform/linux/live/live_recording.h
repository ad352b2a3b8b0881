// What this host's drivers show at one moment, as recordings.
#pragma once

#include "platform/linux/live/live_host.h"

namespace tbdaily {

struct LiveRecording {
  PlistDictionary registry;  // registry.plist: the same entries, with a recorded hub
  PlistDictionary hub;       // hub.plist: the values of this moment
};

LiveRecording recordLiveHost(const LiveHost& host);

}  // namespace tbdaily
