#include <gmock/gmock.h>
#include <unistd.h>

#include <array>
#include <cmath>

#include "drivermetrics/metrics_test_support.h"
#include "platform/byte_writer.h"

namespace kdreport {
namespace {

using testing::channelType, testing::sampled;

constexpr std::int64_t kNanoseconds = 0x0100007600000000, kTicks = 0x0101000000000000;

TEST(Units, HaveLabels) {
  // Quantities without a scale, prefixes (75: a scale without one), and units that have whole labels.
  std::istringstream labels(
      "0 - 0100000000000000 s 0200000000000000 W 0300000000000000 J 0400000000000000 A 0500000000000000 V "
      "0600000000000000 F 0700000000000000 H 0800000000000000 Hz 0900000000000000 b 0900820000000000 B "
      "0900810000000000 - 0A00000000000000 C 0B00000000000000 ?? 3700000000000000 ?? 6400000000000000 events "
      "6500000000000000 packets 0100007300000000 ps 0100007600000000 ns 0100007900000000 us "
      "0100007C00000000 ms 6500008200000000 kpackets 0800008500000000 MHz 0800008800000000 GHz "
      "0800008B00000000 THz 0900890000000000 Ki 09008C0000000000 KiB 09008C0000000004 4KiB "
      "09008C0000000008 8KiB 6400930000000000 Mievents 0900960000000000 MiB 09009D0000000000 Gi "
      "0900A00000000000 GiB 0900A70000000000 Ti 0900AA0000000000 TiB 0100007500000000 s "
      "0100007980000018 24Mticks 0900007600000001 1Gticks 0101000000000000 hwticks? "
      "0902000000000000 hwpage? 0103000000000000 s");
  std::int64_t unit = 0;
  for (std::string label; labels >> std::hex >> unit >> label;)
    EXPECT_EQ(KdReportCopyUnitLabel(unit), label == "-" ? "" : label) << std::hex << unit;
  EXPECT_TRUE(labels.eof());
  EXPECT_EQ(KdReportCopyUnitLabel(kKdReportInvalid), std::nullopt);
}

TEST(Units, HaveExactFactors) {
  using Number = std::uint64_t;
  // At the end: 10^126 in 64 bits, an exponent of 128, which is one of -128, and one that is shifted out.
  const std::tuple<std::int64_t, Number, Number> rows[] = {{0, 1, 1},
                                                           {0x7980000018, 1, 24000000},
                                                           {0x8C0000000004, 32768, 1},
                                                           {5, 5, 1},
                                                           {0x80000000, 1, 1},
                                                           {0x7F7F00000000, 1, 1},
                                                           {0x828200000003, 3 * 8 * 1000, 1},
                                                           {0x9200000000, 10000000000000000000U, 1},
                                                           {0x0100000000, 1, 0},
                                                           {0xFFFF00000000, 1, 0},
                                                           {0xBF0000000000, 0, 1}};
  for (const auto& [scale, multiplier, divisor] : rows) {
    Number numerator = 9, denominator = 9;
    EXPECT_EQ(KdReportUnitGetScale(scale, numerator, denominator), kKdSuccess);
    EXPECT_EQ(std::pair(numerator, denominator), std::pair(multiplier, divisor)) << std::hex << scale;
  }
  EXPECT_DOUBLE_EQ(KdReportScaleValue(1500, kNanoseconds, kKdReportSeconds), 1.5e-6);
  EXPECT_EQ(KdReportScaleValue(~std::uint64_t{0}, kKdReportSeconds, kKdReportSeconds),
            18446744073709551616.0);
  EXPECT_TRUE(std::isnan(KdReportScaleValue(1, kKdReportSeconds, 0x0900000000000000)));
  EXPECT_TRUE(std::isnan(KdReportScaleValue(1, kTicks, kKdReportSeconds)));
}

PlistDictionary unit(std::int64_t code) {
  return *KdReportCreateUnitInfo(code).asDictionary();
}

TEST(Descriptions, OfChannels) {
  const auto channel = sampled(channelType(1, 1, 0x100), {}, unit(kNanoseconds));
  EXPECT_EQ(KdReportChannelCopyDescription(channel.get(), 0, "> "),
            "> D1 CH < 0x4348 (ns) | G/g (none)/(none) | cat 0x100 | format 0x01 | elts 1 >\n");
  const auto bare = testing::channelOf(1, 0xFF, channelType(0, 0));
  testing::groupOf(*bare).groupName = PlistValue::string("G");
  EXPECT_EQ(KdReportChannelCopyDescription(bare.get(), 0, {}),
            "D1 (null) < 0xff ((null)) | G/g G/(none) | cat 0000 | format 0000 | elts 0 >\n");
  EXPECT_EQ(KdReportChannelCopyDescription(nullptr, 0, {}), std::nullopt);
}

TEST(Descriptions, OfSamples) {
  const auto describe = [](const KdReportChannel& channel) {
    return KdReportSampleCopyDescription(channel.get(), 0, ">").value_or("none");
  };
  EXPECT_EQ(describe(sampled(channelType(1), {{1, {-5}}}, unit(0))),
            ">                              CH = {           -5  }\n");
  EXPECT_EQ(describe(sampled(channelType(2, 2), {{1, {0x4F4E, 7, 1500}}, {2, {0x4F4646, 8, 4500}}},
                             unit(kNanoseconds))),
            ">                  CH[      ON] = { # 7        1.500e-06 s / 25.0% }\n"
            ">                  CH[     OFF] = { # 8        4.500e-06 s / 75.0% }\n");
  EXPECT_EQ(describe(sampled(channelType(2, 1), {{1, {1, 0, 0}}}, unit(kTicks))),
            ">                  CH[     0x1] = { # 0              nan s /  nan% }\n");
  const auto named = sampled(channelType(2, 2), {{1, {1, 7, 0}}, {2, {2, 8, 0}}}, unit(kTicks));
  named->cache(CachedAnswer::StateNames,
               PlistValue::array({PlistValue::int64(5), PlistValue::string("OFF")}));
  EXPECT_EQ(describe(named),
            ">                  CH[     0x1] = { # 7              nan s /  nan% }\n"
            ">                  CH[     OFF] = { # 8              nan s /  nan% }\n");
  PlistData bucketsOfTen(16);
  bucketsOfTen[0] = std::byte{10};
  bucketsOfTen[12] = std::byte{2};  // so many
  PlistDictionary info = unit(kNanoseconds);
  info.set("KdReportChannelConfig", PlistValue::data(bucketsOfTen));
  EXPECT_EQ(describe(sampled(channelType(3, 2), {{1, {2, 3, 9, 12}}, {1, {0, 0, 0, 0}}}, info)),
            ">                  CH[           0 -           10 ns] = { m            3; M            9; s     "
            "      12; # "
            "           2 }\n"
            ">                  CH[          10 -           20 ns] = { <no hits>; # 0 }\n");
  EXPECT_EQ(describe(sampled(channelType(3, 2), {{1, {kKdReportInvalid}}, {}}, info)), "none");
  EXPECT_EQ(describe(sampled(channelType(3, 3), {{}, {}, {}}, info)), "none") << "a bucket without bounds";
  EXPECT_EQ(describe(sampled(channelType(4, 2), {{}, {}})), "arrays unsupported?arrays unsupported?");
  EXPECT_EQ(describe(sampled(channelType(5), {{}})), "none");
  EXPECT_EQ(describe(testing::channelOf(1, 2)), "none");

  const auto nameless = testing::channelOf(1, 0x123456789A);
  PlistData bytes;
  testing::appendElement(bytes, 1, 0x123456789A, channelType(1));
  nameless->copyElements(bytes);
  EXPECT_EQ(describe(nameless), ">                       0x1234567 = {            0 (null) }\n");
}

TEST(Texts, AreWrittenInOneCall) {
  std::array<int, 2> ends{};
  ASSERT_EQ(::pipe(ends.data()), 0);
  EXPECT_EQ(KdReportWriteStringUTF8(ends[1], "gr\xC3\xBC\xC3\x9F"), kKdSuccess);
  for (const KdReportText none : {KdReportText(), KdReportText(nullptr), KdReportText(std::nullopt)})
    EXPECT_EQ(KdReportWriteStringUTF8(ends[1], none), kKdBadArgument);
  EXPECT_EQ(KdReportWriteStringUTF8(ends[1], "\xFF"), kKdNoMemory);
  EXPECT_EQ(KdReportWriteStringUTF8(-1, "x"), kKdIOError);
  std::array<char, 16> read{};
  EXPECT_EQ(std::string(read.data(), static_cast<std::size_t>(::read(ends[0], read.data(), read.size()))),
            "gr\xC3\xBC\xC3\x9F");
  ::close(ends[0]);
  ::close(ends[1]);
  EXPECT_EQ(KdReportCopyCurrentProcessName(), "drivermetrics_test <pid " + std::to_string(::getpid()) + ">");
}

}  // namespace
}  // namespace kdreport
