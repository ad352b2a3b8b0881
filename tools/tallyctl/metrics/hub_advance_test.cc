// The sample hub and made-up ones, moved on.
#include "tools/tallyctl/metrics/hub_advance.h"

#include <gtest/gtest.h>

#include "testing/json_test_support.h"
#include "tools/tallyctl/metrics/hub_legends.h"
#include "tools/tallyctl/sample/metrics.h"

namespace tbdaily {
namespace {

constexpr std::uint64_t kYear = 31'536'000;

using Words = std::vector<std::int64_t>;
struct Channel {
  std::int64_t driver, id, format;
  std::vector<Words> rows;  // the stamp and four words of each element
};

std::vector<Channel> channelsOf(const PlistValue& root) {
  std::vector<Channel> channels;
  const PlistValue list = root.asDictionary()->get("channels");
  for (const PlistValue& value : *list.asArray()) {
    const PlistDictionary& channel = *value.asDictionary();
    const auto number = [&channel](const char* key) { return channel.get(key).asInteger().value(); };
    channels.push_back({number("driver"), number("channel"), number("type") & 0xFF, {}});
    const PlistValue elements = channel.get("elements");
    for (const PlistValue& element : *elements.asArray()) {
      Words row{element.asDictionary()->get("stamp").asInteger().value()};
      const PlistValue words = element.asDictionary()->get("words");
      for (const PlistValue& word : *words.asArray()) row.push_back(*word.asInteger());
      row.resize(5);
      channels.back().rows.push_back(row);
    }
  }
  return channels;
}

std::int64_t total(const Channel& channel, std::size_t word) {
  std::uint64_t sum = 0;
  for (const Words& row : channel.rows) sum += static_cast<std::uint64_t>(row[1 + word]);
  return static_cast<std::int64_t>(sum);
}

void expectValidBuckets(const Channel& channel, const ChannelMeaning& meaning) {
  std::int64_t lower = 0;
  const auto bounds = meaning.bucketBounds(channel.rows.size());
  ASSERT_EQ(bounds.size(), channel.rows.size());
  for (std::size_t i = 0; i < bounds.size(); lower = bounds[i++]) {
    const std::int64_t hits = channel.rows[i][1], least = channel.rows[i][2], most = channel.rows[i][3];
    if (hits == 0) continue;
    EXPECT_TRUE(lower <= least && least <= most && most < bounds[i]);
    EXPECT_TRUE(hits * least <= channel.rows[i][4] && channel.rows[i][4] <= hits * most);
  }
}

TEST(HubAdvance, MovesEveryChannelOfTheSample) {
  const PlistValue hub = PlistValue::dictionary(sampleHub());
  const PlistValue registry =
      PlistValue::dictionary({{"entries", PlistValue::array(sampleMetricsEntries())}});
  const HubLegends legends(registry);
  for (const std::uint64_t seconds : {std::uint64_t{1}, std::uint64_t{3}, std::uint64_t{3'601}, kYear}) {
    const AdvancedHub later = advancedHub(hub, registry, seconds);
    EXPECT_EQ(later.root, advancedHub(hub, registry, seconds).root);
    const std::vector<Channel> before = channelsOf(hub), after = channelsOf(later.root);
    ASSERT_EQ(later.channels, before.size());
    for (std::size_t i = 0; i < before.size(); ++i) {
      SCOPED_TRACE("channel " + std::to_string(before[i].id) + " after " + std::to_string(seconds));
      const ChannelMeaning meaning = legends.meaningOf(before[i].driver, before[i].id);
      EXPECT_GT(std::ranges::max(after[i].rows)[0], std::ranges::max(before[i].rows)[0]);
      const std::int64_t grown = total(after[i], 2) - total(before[i], 2);
      if (before[i].format == 2) {
        EXPECT_EQ(grown, static_cast<std::int64_t>(meaning.unitsIn(seconds).value_or(seconds)));
        EXPECT_GE(total(after[i], 1), total(before[i], 1) + (seconds > 3'600 ? 1 : 0));
      } else if (before[i].format == 3) {
        EXPECT_GE(total(after[i], 0), total(before[i], 0) + static_cast<std::int64_t>(seconds));
        expectValidBuckets(after[i], meaning);
      } else {
        const std::int64_t moved = total(after[i], 0) - total(before[i], 0);
        EXPECT_NE(moved, 0);
        const bool isMeasured = meaning.quantity() > 2 && meaning.quantity() < 11 && meaning.quantity() != 9;
        EXPECT_TRUE(isMeasured ? std::abs(moved) <= total(before[i], 0) / 4 : moved > 0);
      }
    }
  }
}

PlistValue hubOf(std::string_view type, std::string_view elements) {
  return testing::plistOf(R"({"channels": [{"driver": 1, "channel": 2, "type": )" + std::string(type) +
                          R"(, "elements": [)" + std::string(elements) + "]}]}");
}

TEST(HubAdvance, LeavesWhatItCannotMove) {
  constexpr const char* kOne = R"({"stamp": 1, "words": [1]})";
  for (const PlistValue& hub :
       {PlistValue(), testing::plistOf("{}"), testing::plistOf(R"({"channels": 1})"),
        testing::plistOf(R"({"channels": [1]})"), hubOf("1", ""), hubOf("1", "1"), hubOf("0", kOne),
        hubOf("3", kOne), hubOf(R"("1")", kOne), hubOf("1", R"({"stamp": "1"})"),
        hubOf("1", R"({"stamp": 1, "words": [1, 2, 3, 4, 5]})"),
        hubOf("4", R"({"stamp": 1, "words": [1]}, {"stamp": 1, "words": [1.0]})")}) {
    const AdvancedHub later = advancedHub(hub, PlistValue(), 5);
    EXPECT_TRUE(later.root == hub && later.channels == 0);
  }
}

TEST(HubAdvance, WrapsAndKeepsTheInvalidNumber) {
  const auto advanced = [](std::string_view type, std::string_view elements) {
    return channelsOf(advancedHub(hubOf(type, elements), PlistValue(), kYear).root)[0];
  };
  const Channel state = advanced("2", R"({"stamp": -1, "words": []}, {"stamp": 9223372036854775807,
      "words": [1, 9223372036854775807, 9223372036854775807, -1]})");
  EXPECT_EQ(total(state, 2), INT64_MIN + static_cast<std::int64_t>(kYear) - 1);
  EXPECT_EQ(state.rows[1][4], -1);
  const Words kept =
      advanced("4", R"({"stamp": 1, "words": [-9223372036854775808, 9223372036854775807]})").rows[0];
  EXPECT_EQ(kept[1], INT64_MIN);
  EXPECT_NE(kept[2], INT64_MAX);
}

}  // namespace
}  // namespace tbdaily
