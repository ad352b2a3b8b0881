// Cumulative network usage of each process.
//
// Absent service: a request is accepted and its reply never comes.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <span>
#include <string>
#include <string_view>

#include "platform/plist_value.h"

namespace tbdaily {

enum class UsageNameKind : std::uint8_t { ProcessName };

// The entry of a usage record that holds the moment from which its counters count (a date).
inline constexpr std::string_view kUsageSinceTimeKey = "since";

// `records` is an array of dictionaries: "bundleName", "procName", the since-time, "wifiInBytes",
// "wifiOutBytes", "wwanInBytes", "wwanOutBytes". Called at most once, on a thread other than the requester's.
using UsageReplyHandler = std::function<void(const PlistValue& records)>;

class UsageFeed {
 public:
  virtual ~UsageFeed() = default;
  // No names: all processes. Returns at once; the handler must not refer to what the caller may have released
  // by then.
  virtual void requestUsageToDate(std::span<const std::string> names, UsageNameKind kind,
                                  UsageReplyHandler handler) = 0;
};

class UsageWorkspace {
 public:
  virtual ~UsageWorkspace() = default;
  virtual std::unique_ptr<UsageFeed> createFeed() = 0;  // null on failure
};

class UsageService {
 public:
  virtual ~UsageService() = default;
  virtual std::unique_ptr<UsageWorkspace> createWorkspace() = 0;  // null on failure
};

}  // namespace tbdaily
