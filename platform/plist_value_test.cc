#include "platform/plist_value.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <set>

#include "platform/keyed_hash.h"

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

// Keys that are alike in all but one bit, at every length and place.
TEST(KeyedHash, TellsAlikeKeysApart) {
  std::set<std::uint32_t> hashes;
  std::size_t keys = 0;
  for (std::size_t length = 0; length < 300; ++length) {
    std::string key(length, '\0');
    hashes.insert(KeyedHash::of(key));
    hashes.insert(KeyedHash::of(length, 0));
    for (char& c : key) {
      c = 1;
      hashes.insert(KeyedHash::of(key));
      c = 0;
    }
    keys += length + 2;
    EXPECT_EQ(KeyedHash::of(key), KeyedHash::of(std::string(length, '\0')));
  }
  EXPECT_GT(hashes.size(), keys - 50);
}

TEST(KeyedHash, SpreadsIdentifiersWhoeverChoseThem) {
  // Multiples that meet in one place where identifiers are spread by the usual multiplication, by 2^64 over
  // the golden ratio: they are of its inverse.
  constexpr std::uint64_t kInverse = 0xF1DE83E19937733D;
  std::array<int, 4096> places{};
  for (std::uint64_t i = 1; i <= places.size(); ++i) ++places[KeyedHash::of(0, i * kInverse) % places.size()];
  EXPECT_LT(*std::ranges::max_element(places), 20);
}

}  // namespace
}  // namespace tbdaily
