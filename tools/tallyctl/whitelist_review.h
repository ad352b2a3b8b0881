// What there is to say of a device's whitelist.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "platform/platform.h"
#include "report/tb_config.h"
#include "tools/tallyctl/captured_log.h"

namespace tbdaily {

struct WhitelistReview {
  CapturedLog log;                    // of the loading; outlives the whitelist, which keeps it
  std::unique_ptr<TBConfig> config;   // null when it cannot be loaded: the log says why
  std::vector<std::string> problems;  // what the job complains about, then what is odd
  bool isFault =
      false;  // rules that cannot be read, or unknown options: a rule does not hold as its author meant
};

std::unique_ptr<WhitelistReview> reviewWhitelist(const Platform& platform);

// The root of the file; none when it is missing or cannot be parsed.
PlistValue whitelistRoot(Platform& platform);

}  // namespace tbdaily
