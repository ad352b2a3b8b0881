// What callers rely on in every PropertyListCodec. The subject is that of ContractTest.
#pragma once

#include "testing/contract_test.h"

namespace tbdaily::testing {

template <typename Subject>
struct PropertyListCodecContract : ContractTest<Subject> {
  PropertyListCodec& codec = this->services.propertyListCodec;
};
TYPED_TEST_SUITE_P(PropertyListCodecContract);

TYPED_TEST_P(PropertyListCodecContract, TheExactFormKeepsValueAndKindAndOrder) {
  using Single = std::numeric_limits<float>;
  using Double = std::numeric_limits<double>;
  using Integer = std::numeric_limits<std::int64_t>;
  PlistArray all{PlistValue::boolean(true), PlistValue::boolean(false),
                 PlistValue::array({}),     PlistValue::dictionary({}),
                 PlistValue::int8(-128),    PlistValue::int32(std::numeric_limits<std::int32_t>::min())};
  for (const std::int64_t v : {Integer::min(), Integer::max()}) all.push_back(PlistValue::int64(v));
  for (const float v : {0.1F, Single::max(), Single::denorm_min(), -Single::infinity()})
    all.push_back(PlistValue::float32(v));
  for (const double v :
       {0.1, -0.0, 3.0, 1e300, Double::denorm_min(), Double::infinity(), Double::quiet_NaN()})
    all.push_back(PlistValue::float64(v));
  for (const double v : {0.0, 1e-20, 817376824.123456, -0.1, -Double::denorm_min(), -1e12 - 0.5, 1e15})
    all.push_back(PlistValue(PlistDate{v}));
  for (const char* text : {"", " <a> & 'b' \"c\" ]]> \t\r\n\r ", "gr\u00fc\u00df \u6f22 \U0001F600"})
    all.push_back(PlistValue::string(text));
  for (const std::size_t size : {0U, 1U, 2U, 3U, 1000U})
    all.push_back(PlistValue::data(PlistData(size, std::byte{0xFB})));
  const std::vector<std::string> keys{"zebra", "", "a & b", "Mango\r\n", "apple"};
  PlistDictionary dictionary;
  for (const std::string& key : keys) dictionary.set(key, PlistValue::array(all));
  all.push_back(PlistValue::dictionary(dictionary));

  PlistParseResult read;
  for (const PlistValue& value : all) {
    const PlistWriteResult written = this->codec.write(value);
    ASSERT_TRUE(written.ok) << written.error;
    read = this->codec.parse(bytesOf(written.bytes));
    EXPECT_TRUE(read.value == value) << written.bytes << read.error;
  }
  ASSERT_NE(read.value.asDictionary(), nullptr);
  std::vector<std::string> keysRead;
  for (const auto& [key, value] : *read.value.asDictionary()) keysRead.push_back(key);
  EXPECT_EQ(keysRead, keys);
}

TYPED_TEST_P(PropertyListCodecContract, GarbageAndAbsentValuesAreErrors) {
  for (const std::string_view text : {"", "garbage", "<plist", "bplist00", "\xFF\xFE<\0"}) {
    const PlistParseResult read = this->codec.parse(bytesOf(text));
    EXPECT_TRUE(read.value.isNone()) << text;
    EXPECT_NE(read.error, "") << text;
  }
  for (const PlistForm form : {PlistForm::Exact, PlistForm::Plain}) {
    const PlistWriteResult written = this->codec.write(PlistValue(), form);
    EXPECT_TRUE(!written.ok && written.bytes.empty());
    EXPECT_NE(written.error, "");
  }
}

REGISTER_TYPED_TEST_SUITE_P(PropertyListCodecContract, TheExactFormKeepsValueAndKindAndOrder,
                            GarbageAndAbsentValuesAreErrors);

}  // namespace tbdaily::testing
