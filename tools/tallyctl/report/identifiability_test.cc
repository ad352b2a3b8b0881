#include "tools/tallyctl/report/identifiability.h"

#include <gtest/gtest.h>

#include <limits>
#include <set>

#include "report/scalar_rounding.h"

namespace tbdaily {
namespace {

PlistDictionary rules(std::optional<std::int64_t> interval, std::optional<std::int64_t> figures) {
  PlistDictionary options;
  if (interval) options.set(whitelist_option::kBucketInterval, PlistValue::int64(*interval));
  if (figures) options.set(whitelist_option::kSignificantFigures, PlistValue::int64(*figures));
  return options;
}

TEST(Identifiability, CountsWhatARuleLetsThrough) {
  EXPECT_EQ(distinctScalars(rules({}, {})), std::nullopt);
  EXPECT_EQ(distinctScalars(rules(1, {})), std::nullopt);
  EXPECT_EQ(distinctScalars(rules({}, 19)), std::nullopt);
  EXPECT_EQ(distinctScalars(rules({}, -1)), std::nullopt);
  EXPECT_EQ(distinctScalars(rules(0, {})), 1U);
  EXPECT_EQ(distinctScalars(rules(2, {})), (std::uint64_t{1} << 63) + 1);
  EXPECT_EQ(distinctScalars(rules(std::numeric_limits<std::int64_t>::max(), {})), 3U);
  EXPECT_EQ(distinctScalars(rules({}, 1)), 343U);  // 1 to 10, nine a decade up to 9e18; both signs, and 0
  EXPECT_EQ(distinctScalars(rules({}, 0)), 41U);
  EXPECT_EQ(distinctScalars(rules(1'000'000'000'000'000'000, 1)), 19U);
}

TEST(Identifiability, NoRuleLetsMoreThroughThanItIsCountedFor) {
  for (const auto& [interval, figures] : {std::pair<std::int64_t, std::int64_t>{0, 0},
                                          {0, 1},
                                          {0, 2},
                                          {3'000'000'000'000'000'001, 9},
                                          {1'000'000'000'000'000'000, 1}}) {
    const PlistDictionary options = rules(interval != 0 ? std::optional(interval) : std::nullopt, figures);
    std::set<std::int64_t> seen;
    constexpr auto kMost = static_cast<std::uint64_t>(std::numeric_limits<std::int64_t>::max());
    for (std::uint64_t magnitude = 1; magnitude <= kMost; magnitude += magnitude / 701 + 1) {
      const auto value = static_cast<std::int64_t>(magnitude);
      seen.insert(roundedScalar(value, options));
      seen.insert(roundedScalar(-value, options));
    }
    for (const std::int64_t value : {std::int64_t{0}, std::numeric_limits<std::int64_t>::max(),
                                     std::numeric_limits<std::int64_t>::min()})
      seen.insert(roundedScalar(value, options));
    EXPECT_LE(seen.size(), distinctScalars(options)) << interval << " " << figures;
    EXPECT_GE(seen.size() + 4, distinctScalars(options)) << interval << " " << figures;
  }
}

}  // namespace
}  // namespace tbdaily
