#include "storage/structured_logs.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <limits>

#include "storage/nand_info.h"
#include "storage/storage_test_support.h"
#include "storage/write_amplification.h"
#include "testing/fake_platform.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;

constexpr const char* kNvme = "VelmoraEmbeddedNVMeController";

PlistValue number(std::int64_t n) {
  return PlistValue::int64(n);
}
PlistValue text(const char* t) {
  return PlistValue::string(t);
}

std::vector<std::byte> words(const std::vector<std::uint32_t>& values) {
  std::vector<std::byte> bytes;
  for (const std::uint32_t value : values) {
    for (int shift = 0; shift < 32; shift += 8) bytes.push_back(static_cast<std::byte>(value >> shift));
  }
  return bytes;
}

// A telemetry list of channels whose words count up, and whose summaries do too.
std::vector<std::byte> telemetry(std::uint32_t channels) {
  std::vector<std::uint32_t> values;
  for (std::uint32_t i = 0; i < channels * 1024; ++i) values.push_back(i);
  for (std::uint32_t i = 0; i < channels * 8; ++i) values.push_back(1000000 + i);
  return words(values);
}

class StructuredLogsTest : public ::testing::Test {
 protected:
  StructuredLogsTest() { gStorageLogState = {}; }
  ~StructuredLogsTest() override { EXPECT_EQ(fake.driverRegistry.openHandles(), 0U); }

  FetchedList list(const std::vector<std::byte>& bytes, PlistDictionary characteristics,
                   const char* className = kNvme) {
    return {bytes, bytes.size(), PlistValue::dictionary(std::move(characteristics)), className};
  }
  PlistDictionary characteristics(std::int64_t buses) {
    return {{"chip-id", text("Q8A")}, {"manufacturer-id", text("4582603A5700")}, {"num-bus", number(buses)}};
  }
  const std::vector<std::pair<int, PlistDictionary>>& logs() { return fake.logSubmission.structured; }

  testing::FakePlatform fake;
  testing::CapturedDiagnostics diagnostics;
};

TEST(WriteAmplification, CountsErasedUnitsForEachUnitWritten) {
  StatsContext context;
  context.bytesPerPage = 16384;
  context.pagesPerVirtualBlock = 256;
  context.bandErases = 1000;
  context.hostWrites = 1 << 20;
  EXPECT_EQ(computeWriteAmplification(context).user, static_cast<double>(1000.0F * 1024 / (1 << 20)));
  EXPECT_EQ(computeWriteAmplification(context).system, 0);
  context.bytesPerPage = 0x10000;
  context.pagesPerVirtualBlock = 0x10001;  // the product wraps to 0x10000
  EXPECT_EQ(computeWriteAmplification(context).user, static_cast<double>(1000.0F * 16 / (1 << 20)));
  context.hostWrites = 0;
  EXPECT_EQ(computeWriteAmplification(context).user, std::numeric_limits<double>::infinity());
  context.bandErases = 0;
  EXPECT_TRUE(std::isnan(computeWriteAmplification(context).user));
}

TEST(WriteAmplification, TheThresholdIsARealNumberBetweenZeroAndTen) {
  testing::FakePreferences preferences;
  const auto above = [&](double user, const PlistValue& threshold) {
    preferences.domains["com.velmora.NANDInfo"] = {};
    preferences.domains["com.velmora.NANDInfo"].set("userWAmp", threshold);
    return isAboveThreshold(user, preferences);
  };
  EXPECT_TRUE(above(1.7, PlistValue::float32(1.5F)));
  EXPECT_FALSE(above(1.7, PlistValue::float64(12)));
  EXPECT_FALSE(above(1.7, number(1)));
  EXPECT_FALSE(above(2.0, {}));
  EXPECT_TRUE(above(2.5, PlistValue::float64(0)));
  EXPECT_TRUE(above(std::numeric_limits<double>::infinity(), {}));
  EXPECT_FALSE(above(std::nan(""), PlistValue::float64(1)));
}

TEST_F(StructuredLogsTest, ValidityListsAreCollectedByIndexInEntryOrder) {
  gStorageLogState.gNeedValidityList = true;
  gStorageLogState.gCurrentUserWamp = 3.5;
  fake.kernel.now = PlistDate::fromUnixSeconds(1795597624);
  const auto bytes =
      words({4, 1, 77, 77, 0, 2, 11, 0, 0, 0, 0, 12, 0, 0, 0, 2, 0xFFFFFFFF, 0, 0, 0, 16, 5, 0, 0});
  EXPECT_TRUE(HandleValidityList(fake.platform, list(bytes, {}), diagnostics));
  ASSERT_EQ(fake.logSubmission.logs.size(), 1U);
  const std::string& log = fake.logSubmission.logs[0].bytes;
  EXPECT_EQ(fake.logSubmission.logs[0].type, "165");
  EXPECT_THAT(log, HasSubstr("UserWamp"));
  EXPECT_THAT(log, HasSubstr("ValidityList[0]"));
  EXPECT_THAT(log, HasSubstr("ValidityList[2]"));
  EXPECT_THAT(log, ::testing::Not(HasSubstr("ValidityList[1")));
}

TEST_F(StructuredLogsTest, ValidityListsThatDoNotFitAreRefused) {
  const auto good = words({1, 0, 0, 3, 4, 0, 0});
  EXPECT_TRUE(
      HandleValidityList(fake.platform, list(words({9, 9}), {}), diagnostics));  // not wanted on this run
  gStorageLogState.gNeedValidityList = true;
  for (const auto& bad :
       {words({0, 0}), words({1, 0, 0, 3, 4, 0}), words({0xFFFFFFFF, 0xFFFFFFFF, 1, 2, 3, 4}),
        words({0x0CCCCCCD, 0x1FFFFFFF, 1, 2, 3, 4}), std::vector<std::byte>(3)}) {
    diagnostics.errors.clear();
    EXPECT_FALSE(HandleValidityList(fake.platform, list(bad, {}), diagnostics));
    EXPECT_EQ(diagnostics.errors, "data cannot be parsed");
  }
  EXPECT_TRUE(fake.logSubmission.logs.empty());
}

TEST_F(StructuredLogsTest, TelemetryLogsOneRecordForEachChannel) {
  auto bytes = telemetry(2);
  EXPECT_TRUE(HandleTelemetryList(fake.platform, list(bytes, characteristics(2)), diagnostics));
  ASSERT_EQ(logs().size(), 2U);
  EXPECT_EQ(logs()[1].first, 176);
  const PlistDictionary& second = logs()[1].second;
  EXPECT_EQ(second.get("RD"), PlistValue::int32(1000008));
  EXPECT_EQ(second.get("num_pages"), PlistValue::int32(1000014));
  EXPECT_TRUE(second.contains("readStage[32]") && second.contains("retentionIndication[11]"));
  EXPECT_FALSE(second.contains("readStage[33]") || second.contains("algoNANDAccessesBin[0]"));
  EXPECT_EQ(second.size(), 7U + 33 + 23 + 8 + 38 + 12 + 10 + 10 + 10 + 12 + 12);
  EXPECT_TRUE(HandleTelemetryList(fake.platform, list(bytes, characteristics(0)), diagnostics));
  EXPECT_EQ(diagnostics.errors, "");
  bytes.pop_back();
  for (const std::int64_t buses : {2LL, -1LL, 0x7FFFFFFFLL}) {
    diagnostics.errors.clear();
    EXPECT_FALSE(HandleTelemetryList(fake.platform, list(bytes, characteristics(buses)), diagnostics));
    EXPECT_EQ(diagnostics.errors, "ERROR: Attempting to parse beyond the bounds of the buffer\n");
  }
}

TEST_F(StructuredLogsTest, TelemetrySaysWhatTheCharacteristicsLack) {
  const auto bytes = telemetry(1);
  const auto errorOf = [&](const char* key, PlistValue value) {
    PlistDictionary odd = characteristics(1);
    odd.set(key, std::move(value));
    diagnostics.errors.clear();
    EXPECT_FALSE(HandleTelemetryList(fake.platform, list(bytes, odd), diagnostics));
    return diagnostics.errors;
  };
  EXPECT_EQ(errorOf("chip-id", {}), "ERROR: Could not determine the chip-id\n");
  EXPECT_EQ(errorOf("chip-id", number(1)), "ERROR: chip-id is not stored as a PVStringTypeID\n");
  EXPECT_EQ(errorOf("chip-id", PlistValue::string(std::string(64, 'x'))),
            "ERROR: Unable to obtain chip-id as conversion from the UniChar contents of PVString failed, or "
            "the buffer of 64 "
            "bytes is too small\n");
  EXPECT_EQ(errorOf("manufacturer-id", {}), "ERROR: Could not determine the manufacturer-id\n");
  EXPECT_EQ(errorOf("manufacturer-id", number(1)), "ERROR: manufacturer-id is NULL\n");
  EXPECT_EQ(errorOf("num-bus", text("2")), "ERROR: could not determine the number of channels\n");
  diagnostics.errors.clear();
  EXPECT_FALSE(HandleTelemetryList(fake.platform, {bytes, bytes.size(), text("?"), kNvme}, diagnostics));
  EXPECT_EQ(diagnostics.errors, "ERROR: Could not parse the Device Characteristics dictionary\n");
}

TEST_F(StructuredLogsTest, DefectsAreLoggedWithTheirModeInTheReason) {
  const auto bytes =
      words({0, 42, 1000, 0x00030002, 4, 5, 6, 3, 7, 0x180, 1, 0, 0, 0, 0, 3, 0, 0, 9, 1, 2, 3});
  EXPECT_TRUE(HandleDefectsList(fake.platform, list(bytes, {{"nand-device-desc", number(-2)}}), diagnostics));
  ASSERT_EQ(logs().size(), 3U);  // entries that do not lie wholly inside are left out
  EXPECT_EQ(PlistValue::dictionary(logs()[0].second),
            PlistValue::dictionary({{"Factory Count", PlistValue::int32(42)},
                                    {"com.velmora.NANDInfo.nandDesc", PlistValue::int32(-2)}}));
  EXPECT_EQ(PlistValue::dictionary(logs()[1].second),
            PlistValue::dictionary({{"Bus", PlistValue::int32(2)},
                                    {"CE", PlistValue::int32(3)},
                                    {"CAU", PlistValue::int32(4)},
                                    {"Block", PlistValue::int32(5)},
                                    {"Cycle", PlistValue::int32(6)},
                                    {"Reason", PlistValue::int32(203)},
                                    {"Page", PlistValue::int32(7)},
                                    {"Temperature", PlistValue::int8(-128)}}));
  EXPECT_EQ(logs()[2].second.get("Reason").asInteger(), 3);
  EXPECT_EQ(diagnostics.errors, "Encountered unexpected defectMode: 0x9");
  fake.logSubmission.structured.clear();
  HandleDefectsList(fake.platform, list(bytes, {}, "STXStorage"), diagnostics);
  EXPECT_EQ(logs()[1].second.get("Reason").asInteger(), 3);
}

TEST_F(StructuredLogsTest, EveryListIsFetchedWhateverBecameOfTheOthers) {
  testing::ScriptedController controller(fake.driverRegistry, kNvme);
  controller.buffers[17] = telemetry(1);
  controller.buffers[15] = words({0, 1, 0});
  EXPECT_FALSE(DumpStorageStructuredLog(fake.platform, true, diagnostics));
  EXPECT_EQ(diagnostics.errors, "failed to create dictionary");
  fake.driverRegistry.drivers[0].properties.set("Controller Characteristics",
                                                PlistValue::dictionary(characteristics(1)));
  controller.requests.clear();
  EXPECT_TRUE(DumpStorageStructuredLog(fake.platform, true, diagnostics));
  EXPECT_EQ(logs().size(), 4U);  // three telemetry lists and the defects
  std::vector<std::pair<int, int>> codesAndFlags;
  for (const auto& request : controller.requests) {
    codesAndFlags.emplace_back(std::to_integer<int>(request[0]), std::to_integer<int>(request[4]));
  }
  EXPECT_THAT(codesAndFlags,
              ElementsAre(std::pair{13, 1}, std::pair{13, 0}, std::pair{11, 3}, std::pair{17, 3},
                          std::pair{17, 2}, std::pair{17, 7}, std::pair{17, 6}, std::pair{17, 11},
                          std::pair{17, 10}, std::pair{15, 3}, std::pair{15, 2}));
  diagnostics.errors.clear();
  controller.sizeStatus = kKdBadArgument;
  EXPECT_TRUE(DumpStorageStructuredLog(fake.platform, false, diagnostics));
  EXPECT_THAT(diagnostics.errors,
              HasSubstr("KdConnectCallStructMethod failed with status 0xe00002c2 on selector index 4\n"));
  controller.sizeStatus = 0;
  controller.dataStatus = kKdBadArgument;
  EXPECT_TRUE(DumpStorageStructuredLog(fake.platform, false, diagnostics));
  EXPECT_THAT(diagnostics.errors, HasSubstr("Could not retrieve data from driver for selector 17\n"));
  fake.driverRegistry.drivers.clear();
  EXPECT_FALSE(DumpStorageStructuredLog(fake.platform, false, diagnostics));
  EXPECT_FALSE(gStorageLogState.gNeedValidityList);
}

}  // namespace
}  // namespace tbdaily
