// What callers rely on in every PropertyListCodec. The type parameter is a default-constructible subject with
// `PropertyListCodec& service()`.
#pragma once

#include <gtest/gtest.h>

#include <limits>
#include <span>
#include <string>
#include <string_view>

#include "platform/property_list_codec.h"

namespace tbdaily::testing {

template <typename Subject>
class PropertyListCodecContract : public ::testing::Test {
 protected:
  PropertyListCodec& codec() { return subject_.service(); }

  PlistParseResult parse(std::string_view text) { return codec().parse(std::as_bytes(std::span(text))); }

  void expectRoundTrip(const PlistValue& value) {
    const PlistWriteResult written = codec().write(value);
    ASSERT_TRUE(written.ok) << written.error;
    EXPECT_TRUE(written.error.empty());
    const PlistParseResult read = parse(written.bytes);
    EXPECT_EQ(read.error, "") << written.bytes;
    EXPECT_TRUE(read.value == value) << written.bytes;
  }

 private:
  Subject subject_;
};

TYPED_TEST_SUITE_P(PropertyListCodecContract);

TYPED_TEST_P(PropertyListCodecContract, TheExactFormKeepsValueAndKind) {
  using Single = std::numeric_limits<float>;
  using Double = std::numeric_limits<double>;
  using Integer = std::numeric_limits<std::int64_t>;
  PlistArray scalars = {PlistValue::boolean(true), PlistValue::boolean(false), PlistValue::array({}),
                        PlistValue::dictionary({})};
  scalars.push_back(PlistValue::int8(-128));
  scalars.push_back(PlistValue::int32(std::numeric_limits<std::int32_t>::min()));
  for (const std::int64_t v : {Integer::min(), Integer::max()}) scalars.push_back(PlistValue::int64(v));
  for (const float v : {0.1F, Single::max(), Single::denorm_min(), -Single::infinity()})
    scalars.push_back(PlistValue::float32(v));
  for (const double v : {0.1, -0.0, 3.0, 1e300, Double::denorm_min(), Double::infinity(), -Double::infinity(),
                         Double::quiet_NaN()}) {
    scalars.push_back(PlistValue::float64(v));
  }
  for (const double v : {0.0, 817376824.123456, -0.1, -Double::denorm_min(), -1e12 - 0.5, 1e15}) {
    scalars.push_back(PlistValue(PlistDate{v}));
  }
  for (const char* text : {"", " <a> & 'b' \"c\" ]]> \t\r\n\r ", "gr\u00fc\u00df \u6f22 \U0001F600"}) {
    scalars.push_back(PlistValue::string(text));
  }
  for (const std::size_t size : {0U, 1U, 2U, 3U, 1000U})
    scalars.push_back(PlistValue::data(PlistData(size, std::byte{0xFB})));
  for (const PlistValue& scalar : scalars) this->expectRoundTrip(scalar);
  this->expectRoundTrip(PlistValue::dictionary(
      {{"", PlistValue::array(scalars)},
       {"a & b", PlistValue::dictionary({{"in\r\nner", PlistValue::array(scalars)}})}}));
}

TYPED_TEST_P(PropertyListCodecContract, DictionariesKeepTheOrderOfTheirKeys) {
  PlistDictionary dictionary;
  for (const char* key : {"zebra", "apple", "Mango", "apple2"}) dictionary.set(key, PlistValue::int64(1));
  const PlistParseResult read = this->parse(this->codec().write(PlistValue::dictionary(dictionary)).bytes);
  ASSERT_NE(read.value.asDictionary(), nullptr) << read.error;
  std::string keys;
  for (const auto& [key, value] : *read.value.asDictionary()) keys += key + " ";
  EXPECT_EQ(keys, "zebra apple Mango apple2 ");
}

TYPED_TEST_P(PropertyListCodecContract, GarbageIsAnErrorAndNoValue) {
  for (const std::string_view text : {"", "garbage", "<plist", "bplist00", "\xFF\xFE<\0"}) {
    const PlistParseResult read = this->parse(text);
    EXPECT_TRUE(read.value.isNone()) << text;
    EXPECT_NE(read.error, "") << text;
  }
}

TYPED_TEST_P(PropertyListCodecContract, AnAbsentValueCannotBeWritten) {
  for (const PlistForm form : {PlistForm::Exact, PlistForm::Plain}) {
    const PlistWriteResult written = this->codec().write(PlistValue(), form);
    EXPECT_FALSE(written.ok);
    EXPECT_TRUE(written.bytes.empty());
    EXPECT_NE(written.error, "");
  }
}

REGISTER_TYPED_TEST_SUITE_P(PropertyListCodecContract, TheExactFormKeepsValueAndKind,
                            DictionariesKeepTheOrderOfTheirKeys, GarbageIsAnErrorAndNoValue,
                            AnAbsentValueCannotBeWritten);

}  // namespace tbdaily::testing
