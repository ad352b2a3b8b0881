#include "platform/plist_value.h"

#include <gtest/gtest.h>

namespace tbdaily {
namespace {

TEST(PlistValue, EqualityIsOfValueAndOfKind) {
  EXPECT_FALSE(PlistValue::int32(1) == PlistValue::int64(1));
  EXPECT_FALSE(PlistValue::array({}) == PlistValue());
  EXPECT_TRUE(PlistValue::float64(std::numeric_limits<double>::quiet_NaN()) ==
              PlistValue::float64(std::numeric_limits<double>::quiet_NaN()));
  const auto ab = PlistValue::dictionary(
      {{"a", PlistValue::int64(1)}, {"b", PlistValue::array({PlistValue::string("x")})}});
  const auto ba = PlistValue::dictionary(
      {{"b", PlistValue::array({PlistValue::string("x")})}, {"a", PlistValue::int64(1)}});
  EXPECT_TRUE(ab == ba);
}

TEST(PlistNumber, ConversionsSaturateAndNeverOverflow) {
  EXPECT_EQ(PlistNumber::float64(-2.9).toInt64(), -2);
  EXPECT_EQ(PlistNumber::float64(1e300).toInt64(), std::numeric_limits<std::int64_t>::max());
  EXPECT_EQ(PlistNumber::float64(-1e300).toInt64(), std::numeric_limits<std::int64_t>::min());
  EXPECT_EQ(PlistNumber::float64(std::numeric_limits<double>::quiet_NaN()).toInt64(), 0);
  EXPECT_EQ(PlistNumber::int64(-1).toUInt64(), std::numeric_limits<std::uint64_t>::max());
  EXPECT_EQ(PlistNumber::float64(9223372036854775808.0).toUInt64(), 9223372036854775808U);
  EXPECT_EQ(PlistNumber::float64(1e300).toUInt64(), std::numeric_limits<std::uint64_t>::max());
}

TEST(PlistDictionary, KeepsTheFirstPlaceAndTheLastValueAtEverySize) {
  PlistDictionary dictionary;
  for (int i = 0; i < 1000; ++i) {
    dictionary.set("key" + std::to_string(i), PlistValue::int64(i));
    dictionary.set("key0", PlistValue::int64(-i));
    ASSERT_EQ(dictionary.begin()->first, "key0");
    ASSERT_EQ(dictionary.find("key0")->asInteger(), -i);
    ASSERT_NE(dictionary.find("key" + std::to_string(i)), nullptr);
    ASSERT_EQ(dictionary.find("key" + std::to_string(i + 1)), nullptr);
  }
  dictionary.remove("key500");
  dictionary.set("key501", PlistValue());
  EXPECT_EQ(dictionary.size(), 998U);
  EXPECT_EQ(dictionary.get("key999").asInteger(), 999);
  EXPECT_FALSE(dictionary.contains("key500"));
  EXPECT_FALSE(dictionary.contains("key501"));
}

}  // namespace
}  // namespace tbdaily
