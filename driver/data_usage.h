// Network traffic of each process since the previous run, as analytics counters.
#pragma once

#include <array>
#include <chrono>
#include <cstdint>
#include <functional>
#include <string_view>

#include "platform/analytics_client.h"
#include "platform/platform.h"
#include "platform/plist_value.h"

namespace tbdaily {

inline constexpr std::string_view kUsageBaselineKey = "netUsageBaseline";

// In the order in which they are visited, and stored in a baseline entry behind the since-time.
inline constexpr std::array<std::string_view, 4> kTrafficFields = {"wifiInBytes", "wifiOutBytes",
                                                                   "wwanInBytes", "wwanOutBytes"};

// A step of the daily run: asks the usage service for the traffic to date and waits for its reply to be
// processed, at most as long as said. A reply that comes later is processed all the same, while the process
// lives. Main thread.
void CollectDataUsage(Platform& platform, std::chrono::milliseconds replyTimeout = std::chrono::seconds(10));

// Adds the counters of a reply (an array of usage records) and stores it as the new baseline. On the
// service's thread.
void ProcessDataUsageReply(Platform& platform, const PlistValue& records);

// Called for each increment of an analytics key, in order; the key is borrowed.
using AddUsageKey = std::function<void(std::string_view key, std::int64_t increment)>;

// Compares the records with the stored baseline (a dictionary, or anything else for none), and answers the
// baseline of the next run. Records without a name that can be stored, or without a since-time, are skipped.
// `yesterday` is the first day that is recent enough to count in full.
PlistDictionary compareUsage(const PlistValue& records, const PlistValue& baseline, DayNumber yesterday,
                             const AddUsageKey& addKey);

}  // namespace tbdaily
