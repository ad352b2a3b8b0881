// A complete sample device in a device root.
#pragma once

#include <array>

#include "platform/linux/linux_platform.h"
#include "tools/tallyctl/outcome.h"
#include "tools/tallyctl/sample/variation.h"

namespace tbdaily {

// The controllers that a sample device can have, and the model that carries each.
struct SampleProfile {
  const char* name;
  const char* hardwareModel;
};
inline constexpr std::array<SampleProfile, 2> kSampleProfiles = {{{"nvme", "TP9,3"}, {"stx", "TP4,1"}}};

struct SampleRequest {
  const SampleProfile* profile = &kSampleProfiles[0];
  SampleVariation variation;
  int days = 1;  // of history, up to yesterday; at least 1
};

// Whitelist, preferences with submission enabled, recordings of every family, the support library, and the
// rows of the days. Fails where any of its files is there already; nothing is overwritten.
Outcome<Nothing> makeSampleDevice(LinuxPlatform& platform, const SampleRequest& request);

}  // namespace tbdaily
