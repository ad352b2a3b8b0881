// The storage controller of the sample device: registry entries with a client that serves every kind of
// buffer.
#pragma once

#include <string_view>

#include "platform/plist_value.h"
#include "tools/tallyctl/sample/variation.h"

namespace tbdaily {

// The root of registry.plist. `profile` is "nvme" or "stx": the class of the controller. The write
// amplification is above its threshold, so that a run writes the NAND log.
PlistDictionary sampleRegistry(std::string_view profile, const SampleVariation& variation);

// The bytes of snapshot.kcdata: a kernel task with the thread that freezes memory among its threads.
PlistData sampleStackSnapshot();

// ECC events as the kernel hands them out: an array of 72-byte records.
PlistArray sampleEccEvents();

}  // namespace tbdaily
