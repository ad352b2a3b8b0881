// How much a report could tell a device from others: upper bounds, from the whitelist's rules alone.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "report/tb_config.h"
#include "tools/tallyctl/report/daily_report.h"

namespace tbdaily {

// At most how many different values a scalar can have behind these rules; none where any 64-bit number comes
// through.
std::optional<std::uint64_t> distinctScalars(const PlistDictionary& options);

struct KeyIdentifiability {
  std::string key;
  KeyKind kind = KeyKind::Scalar;
  std::optional<std::uint64_t> values;  // at most; none: unbounded
  bool followsValues = false;           // of so few values that the statistics say each of them

  std::optional<double> bits() const;
};

struct Identifiability {
  std::vector<KeyIdentifiability> keys;  // in the report's order, scalars first
  std::vector<std::string> outside;      // what else the report holds, by the names that it has there
};

// Of what this report holds. A key that the whitelist does not have counts as unbounded.
Identifiability identifiabilityOf(const DailyReport& report, const TBConfig& whitelist);

}  // namespace tbdaily
