// Network traffic of each process since the previous run, as analytics counters.
#pragma once

#include <array>
#include <functional>
#include <string_view>

#include "platform/platform.h"
#include "platform/plist_value.h"

namespace tbdaily {

inline constexpr std::string_view kUsageBaselineKey = "netUsageBaseline";

// In the order in which they are visited, and stored in a baseline entry behind the since-time.
inline constexpr std::array<std::string_view, 4> kTrafficFields = {"wifiInBytes", "wifiOutBytes",
                                                                   "wwanInBytes", "wwanOutBytes"};

// A step of the daily run: asks the usage service for the traffic to date and waits at most 10 seconds for
// its reply to be processed. A reply that comes later is processed all the same, while the process lives.
// Main thread.
void CollectDataUsage(Platform& platform);

// Adds the counters of a reply (an array of usage records) and stores it as the new baseline. On the
// service's thread.
void ProcessDataUsageReply(Platform& platform, const PlistValue& records);

// What a reply comes to.
struct UsageOutcome {
  // Called for each increment of an analytics key, in order; the key is borrowed.
  using AddKey = std::function<void(std::string_view key, std::int64_t increment)>;
  PlistDictionary baseline;  // of the next run
};

// Compares the records with the stored baseline (a dictionary, or anything else for none). Records without a
// name that can be stored, or without a since-time, are skipped. `yesterday` is the first day that is recent
// enough to count in full.
UsageOutcome compareUsage(const PlistValue& records, const PlistValue& baseline, std::int32_t yesterday,
                          const UsageOutcome::AddKey& addKey);

}  // namespace tbdaily
