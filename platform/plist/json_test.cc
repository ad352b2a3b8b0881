#include "platform/plist/json.h"

#include <gtest/gtest.h>

#include <cmath>

namespace tbdaily {
namespace {

TEST(PlistJson, WritesEveryKindOnOneLineOrIndented) {
  const PlistValue value = PlistValue::dictionary(
      {{"z",
        PlistValue::array({PlistValue::int64(std::numeric_limits<std::int64_t>::min()), PlistValue::int8(-1),
                           PlistValue::float64(2), PlistValue::float32(0.5F), PlistValue::float64(1e300),
                           PlistValue::float64(std::nan("")), PlistValue(), PlistValue::boolean(true)})},
       {"a\"\n", PlistValue::string("\x01\\ \u00fc \xFF!\x7f\u009b\u202e")},
       {"d", PlistValue::data({std::byte{255}})},
       {"t", PlistValue::array({PlistValue(PlistDate{817376824.125}), PlistValue(PlistDate{1e300})})},
       {"e", PlistValue::array({})},
       {"o", PlistValue::dictionary({})}});
  EXPECT_EQ(jsonText(value),
            "{\"z\": [-9223372036854775808, -1, 2.0, 0.5, 1e+300, null, null, true], "
            "\"a\\\"\\n\": \"\\u0001\\\\ \u00fc \uFFFD!\\u007f\\u009b\\u202e\", \"d\": \"/w==\", \"t\": "
            "[\"2026-11-26T09:07:04.125Z\", null], "
            "\"e\": [], \"o\": {}}");
  EXPECT_EQ(jsonText(plistFromJson(R"({"a": [1, {}], "b": false})").value, JsonLayout::Indented),
            "{\n  \"a\": [\n    1,\n    {}\n  ],\n  \"b\": false\n}");
}

TEST(PlistJson, ReadsWhatAPropertyListCanHold) {
  const PlistJsonResult read = plistFromJson(
      R"( {"b": [1, -2, 3.0, 1e2, true, "\u00fc\ud83d\ude00"], "a": {}, "b2": 9223372036854775807, "a": 7} )");
  EXPECT_EQ(
      jsonText(read.value),
      "{\"b\": [1, -2, 3.0, 100.0, true, \"\u00fc\U0001F600\"], \"a\": 7, \"b2\": 9223372036854775807}");
}

TEST(PlistJson, EverythingElseIsAnErrorAndNoValue) {
  using namespace std::string_literals;
  for (const std::string& text :
       {""s, "{"s, "[1,]"s, "[1] 2"s, "[1]\0x"s, "{\"a\": null}"s, "[null]"s, "null"s, "9223372036854775808"s,
        "-9223372036854775809"s, "99999999999999999999999"s, "1e999"s, "NaN"s, "{1: 2}"s, "\"\xFF\""s,
        "\"\\ud800\""s, "'a'"s, std::string(1000000, '['), std::string(513, '[') + std::string(513, ']')}) {
    const PlistJsonResult read = plistFromJson(text);
    EXPECT_TRUE(read.value.isNone()) << text.substr(0, 40);
    EXPECT_NE(read.error, "") << text.substr(0, 40);
    EXPECT_EQ(read.error.find('\n'), std::string::npos);
  }
  EXPECT_EQ(plistFromJson(std::string(512, '[') + std::string(512, ']')).error, "");
}

}  // namespace
}  // namespace tbdaily
