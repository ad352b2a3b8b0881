// Plausible days in the analytics store of the sample device.
#pragma once

#include <optional>
#include <string>

#include "platform/analytics_client.h"
#include "platform/linux/store/analytics_store.h"
#include "tools/tallyctl/sample/variation.h"

namespace tbdaily {

// Some hundred scalars and some dozen distributions of up to thousands of values for each of the days, both
// included; the same for the same day and variation. One line with the reason when the store cannot take
// them.
std::optional<std::string> addSampleHistory(AnalyticsStore& store, DayNumber first, DayNumber last,
                                            const SampleVariation& variation);

// Usage records of some dozen processes of the day, as the usage service delivers them: an array of
// dictionaries.
PlistArray sampleUsageRecords(DayNumber day, const SampleVariation& variation);

// The bundle identifiers of the sample device's applications, the user's first.
struct SampleApp {
  std::string identifier;
  bool isUserApp;
};
std::vector<SampleApp> sampleApps();

}  // namespace tbdaily
