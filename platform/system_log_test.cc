#include "platform/system_log.h"

#include <gtest/gtest.h>

#include "platform/plist_text.h"

namespace tbdaily {
namespace {

std::string format(std::string_view text, std::initializer_list<LogArgument> arguments, bool showPrivate) {
  return formatLogMessage(text, {arguments.begin(), arguments.size()}, showPrivate);
}

TEST(LogMessage, HidesTextsAndObjectsButNeverNumbers) {
  const PlistValue object = PlistValue::string("secret");
  EXPECT_EQ(format("a %d b %s c %@", {-5, "text", object}, false), "a -5 b <private> c <private>");
  EXPECT_EQ(format("a %d b %s c %@", {-5, "text", object}, true), "a -5 b text c secret");
  EXPECT_EQ(format("%{public}@ -> %@", {object, object}, false), "secret -> <private>");
  const PlistValue number = PlistValue::float64(0.5);
  EXPECT_EQ(format("%@ of %@", {number, PlistValue::boolean(true)}, false), "0.5 of <private>");
  EXPECT_EQ(format("code %llu", {18446744073709551615U}, false), "code 18446744073709551615");
}

TEST(LogMessage, PassesOverWhatIsNoConversion) {
  EXPECT_EQ(format("passing @{} for %@", {"k"}, true), "passing @{} for k");
  EXPECT_EQ(format("100%% of %d", {3}, true), "100% of 3");
  EXPECT_EQ(format("%d %d", {1}, true), "1 ");
  EXPECT_EQ(format("%s%", {"%d"}, true), "%d");
}

TEST(PlistText, RendersEveryKindOnOneLine) {
  const PlistValue value = PlistValue::array(
      {PlistValue::dictionary({{"bundle", PlistValue::string("a\"b\n")}, {"n", PlistValue::int64(-1)}}),
       PlistValue::boolean(true), PlistValue::float64(0.5),
       PlistValue::data({std::byte{0x0a}, std::byte{0xff}}),
       PlistValue(PlistDate::fromUnixSeconds(1795597624.9)), PlistValue::array({})});
  EXPECT_EQ(plistText(value),
            R"([{"bundle": "a\"b\n", "n": -1}, 1, 0.5, <0aff>, 2026-11-25 09:07:04 +0000, []])");
  EXPECT_EQ(plistText(PlistValue()), "(null)");
  EXPECT_EQ(plistText(PlistValue::string("as it is")), "as it is");
}

}  // namespace
}  // namespace tbdaily
