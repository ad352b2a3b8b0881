// What became of each key that was recorded: reported as it is, coarsened by a rule, or kept here.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "platform/linux/linux_platform.h"
#include "report/tb_config.h"
#include "tools/tallyctl/outcome.h"
#include "tools/tallyctl/report/daily_report.h"

namespace tbdaily {

struct KeyStory {
  std::string key;
  KeyKind kind = KeyKind::Scalar;
  // Of a scalar the number, of a distribution how many values there are. Recorded: the row that a report of
  // the day takes (the day's, else that of the day before); none for what the job measures while it writes.
  std::optional<std::int64_t> recorded;
  std::optional<std::int64_t> reported;  // none for what stays here
  std::string rule;                      // "sig_fig 2", empty without one
  std::string reason;                    // why it stays here; empty for what is reported
};

// Of the report's day: first what it reports, in its order, then what stays here, by key. From a private copy
// of the store; of another device's report there is nothing to tell, which is a failure.
Outcome<std::vector<KeyStory>> keyStories(LinuxPlatform& platform, const DailyReport& report);

// "bucket_interval 10, sig_fig 2"; empty where no rule is set.
std::string ruleText(const PlistDictionary& options);

// The whitelist of the device, where it is the one that the report was made with; else a failure.
struct WhitelistReview;
Outcome<std::unique_ptr<WhitelistReview>> whitelistOf(LinuxPlatform& platform, const DailyReport& report);

}  // namespace tbdaily
