#include "storage/structured_logs.h"

#include <gmock/gmock.h>

#include <cmath>

#include "platform/byte_writer.h"
#include "platform/plist_text.h"
#include "storage/storage_test_support.h"
#include "storage/write_amplification.h"
#include "testing/allocations.h"
#include "testing/fake_platform.h"
#include "testing/json_test_support.h"

namespace tbdaily {
namespace {

using ::testing::HasSubstr;
using testing::plistOf;

constexpr const char* kNvme = "VelmoraEmbeddedNVMeController";

std::vector<std::byte> words(const std::vector<std::uint32_t>& values) {
  std::vector<std::byte> bytes;
  for (const std::uint32_t value : values) appendLittleEndian(bytes, value);
  return bytes;
}

// A telemetry list of channels whose words count up, and whose summaries do too.
std::vector<std::byte> telemetry(std::uint32_t channels) {
  std::vector<std::uint32_t> values;
  for (std::uint32_t i = 0; i < channels * 1024; ++i) values.push_back(i);
  for (std::uint32_t i = 0; i < channels * 8; ++i) values.push_back(1000000 + i);
  return words(values);
}

PlistValue characteristics(std::string_view key = {}, PlistValue value = {}) {
  PlistDictionary all =
      testing::dictionaryOf(R"({"chip-id": "Q8A", "manufacturer-id": "4582603A5700", "num-bus": 1})");
  if (!key.empty()) all.set(key, std::move(value));
  return PlistValue::dictionary(all);
}

struct StructuredLogsTest : ::testing::Test {
  StructuredLogsTest() { gStorageLogState = {}; }
  ~StructuredLogsTest() override { EXPECT_EQ(fake.driverRegistry.openHandles(), 0U); }

  // What the handler of a list says of it.
  std::string verdict(auto& handler, const std::vector<std::byte>& bytes, PlistValue properties,
                      const char* className = kNvme, std::optional<std::size_t> announced = {}) {
    diagnostics.errors.clear();
    const FetchedList list{bytes, announced.value_or(bytes.size()), std::move(properties), className};
    return (handler(fake.platform, list) ? "accepted. " : "refused. ") + diagnostics.errors;
  }
  const std::vector<std::pair<int, PlistDictionary>>& logs() { return fake.logSubmission.structured; }

  testing::FakePlatform fake;
  testing::FakeDiagnostics& diagnostics = fake.diagnostics;
};

TEST(WriteAmplification, CountsErasedUnitsForEachUnitWritten) {
  StatsContext context;
  const auto listed = testing::StatsBuffer().record(129, {8}).record(84, {16});
  EXPECT_TRUE(STXParseBufferToCxt(context, listed.bytes));
  context.bytesPerPage = 0x10000;
  context.pagesPerVirtualBlock = 0x10001;  // the product wraps to 0x10000
  context.bandErases = 1000;
  context.hostWrites = 1 << 20;
  EXPECT_EQ(computeWriteAmplification(context).user, static_cast<double>(1000.0F * 16 / (1 << 20)));
  EXPECT_EQ(computeWriteAmplification(context).system, 8.0 * 16 * 16 / (1 << 20));
  context.hostWrites = 0;
  EXPECT_EQ(computeWriteAmplification(context).user, HUGE_VAL);
  EXPECT_TRUE(std::isnan(computeWriteAmplification({}).user));
}

TEST(WriteAmplification, TheThresholdIsARealNumberBetweenZeroAndTen) {
  const std::tuple<double, PlistValue, bool> cases[] = {
      {1.7, PlistValue::float32(1.5F), true}, {1.7, PlistValue::float64(12), false},
      {1.7, PlistValue::int64(1), false},     {2.0, {}, false},
      {2.5, PlistValue::float64(0), true},    {HUGE_VAL, {}, true}};
  for (const auto& [user, threshold, isAbove] : cases) {
    testing::FakePreferences preferences;
    preferences.setValue("userWAmp", threshold, "com.velmora.NANDInfo");
    EXPECT_EQ(isAboveThreshold(user, preferences), isAbove) << user;
  }
}

TEST_F(StructuredLogsTest, ValidityListsAreCollectedByIndexOrRefused) {
  EXPECT_EQ(verdict(HandleValidityList, words({9, 9}), {}), "accepted. ");  // not wanted on this run
  gStorageLogState.gNeedValidityList = true;
  for (const auto& bad :
       {words({0, 0}), words({1, 0, 0, 3, 4, 0}), words({0xFFFFFFFF, 0xFFFFFFFF, 1, 2, 3, 4}),
        words({0x0CCCCCCD, 0x1FFFFFFF, 1, 2, 3, 4}), std::vector<std::byte>(3)})
    EXPECT_EQ(verdict(HandleValidityList, bad, {}), "refused. data cannot be parsed");
  EXPECT_TRUE(fake.logSubmission.logs.empty());

  const auto good =
      words({4, 1, 77, 77, 0, 2, 11, 0, 0, 0, 0, 12, 0, 0, 0, 2, 0xFFFFFFFF, 0, 0, 0, 16, 5, 0, 0});
  fake.kernel.now = PlistDate::fromUnixSeconds(1795597624);
  EXPECT_TRUE(HandleValidityList(fake.platform, {good, good.size(), {}, kNvme}));
  ASSERT_EQ(fake.logSubmission.logs.size(), 1U);
  EXPECT_EQ(fake.logSubmission.logs[0].type, "165");
  const std::string& log = fake.logSubmission.logs[0].bytes;
  for (const char* part : {"UserWamp", "ValidityList[0]", "ValidityList[2]"})
    EXPECT_THAT(log, HasSubstr(part));
  EXPECT_THAT(log, ::testing::Not(HasSubstr("ValidityList[1")));
}

TEST_F(StructuredLogsTest, TelemetryLogsOneRecordForEachChannel) {
  auto bytes = telemetry(2);
  const auto buses = [](std::int64_t count) { return characteristics("num-bus", PlistValue::int64(count)); };
  EXPECT_EQ(verdict(HandleTelemetryList, bytes, buses(2)), "accepted. ");
  ASSERT_EQ(logs().size(), 2U);
  EXPECT_EQ(logs()[1].first, 176);
  const PlistDictionary& second = logs()[1].second;
  EXPECT_EQ(second.get("RD"), PlistValue::int32(1000008));
  EXPECT_EQ(second.get("num_pages"), PlistValue::int32(1000014));
  EXPECT_TRUE(second.contains("readStage[32]") && second.contains("retentionIndication[11]"));
  EXPECT_FALSE(second.contains("readStage[33]") || second.contains("algoNANDAccessesBin[0]"));
  EXPECT_EQ(second.size(), 7U + 33 + 23 + 8 + 38 + 12 + 10 + 10 + 10 + 12 + 12);
  EXPECT_EQ(verdict(HandleTelemetryList, bytes, buses(0)), "accepted. ");
  bytes.pop_back();
  // A channel that is announced and not filled has no record, and a summary that is not filled is 0.
  for (const auto& [filled, records] : {std::pair{4095U, 0U}, {4096U, 1U}, {8191U, 1U}}) {
    fake.logSubmission.structured.clear();
    const std::vector<std::byte> first(bytes.begin(), bytes.begin() + filled);
    EXPECT_EQ(verdict(HandleTelemetryList, first, buses(18000), kNvme, 18000 * 4128), "accepted. ");
    ASSERT_EQ(logs().size(), records) << filled;
  }
  EXPECT_EQ(logs()[0].second.get("RD"), PlistValue::int32(0));
  for (const std::int64_t odd : {2LL, -1LL, 0x7FFFFFFFLL})
    EXPECT_EQ(verdict(HandleTelemetryList, bytes, buses(odd)),
              "refused. ERROR: Attempting to parse beyond the bounds of the buffer\n");
}

TEST_F(StructuredLogsTest, TelemetrySaysWhatTheCharacteristicsLack) {
  const std::tuple<const char*, PlistValue, std::string> cases[] = {
      {"chip-id", {}, "Could not determine the chip-id"},
      {"chip-id", PlistValue::int64(1), "chip-id is not stored as a PVStringTypeID"},
      {"chip-id", PlistValue::string(std::string(64, 'x')),
       "Unable to obtain chip-id as conversion from the UniChar contents of PVString failed, "
       "or the buffer of 64 bytes is too small"},
      {"manufacturer-id", {}, "Could not determine the manufacturer-id"},
      {"manufacturer-id", PlistValue::int64(1), "manufacturer-id is NULL"},
      {"num-bus", PlistValue::string("2"), "could not determine the number of channels"}};
  const auto bytes = telemetry(1);
  for (const auto& [key, value, error] : cases)
    EXPECT_EQ(verdict(HandleTelemetryList, bytes, characteristics(key, value)),
              "refused. ERROR: " + error + "\n");
  EXPECT_EQ(verdict(HandleTelemetryList, bytes, PlistValue::string("?")),
            "refused. ERROR: Could not parse the Device Characteristics dictionary\n");
  PlistDictionary odd = characteristics("num-bus").mutableDictionary();
  odd.set("manufacturer-id", PlistValue::string("4X82"));
  EXPECT_EQ(verdict(HandleTelemetryList, bytes, PlistValue::dictionary(odd)),
            "refused. ERROR: could not determine the number of channels\n");
  EXPECT_EQ(diagnostics.outputs, "unrecognized hex character: x");
}

TEST_F(StructuredLogsTest, DefectsAreLoggedWithTheirModeInTheReason) {
  const auto bytes =
      words({0, 42, 1000, 0x00030002, 4, 5, 6, 3, 7, 0x180, 1, 0, 0, 0, 0, 3, 0, 0, 9, 1, 2, 3});
  EXPECT_EQ(verdict(HandleDefectsList, bytes, plistOf(R"({"nand-device-desc": -2})")),
            "accepted. Encountered unexpected defectMode: 0x9");
  ASSERT_EQ(logs().size(), 3U);  // entries that do not lie wholly inside are left out
  EXPECT_EQ(plistText(PlistValue::dictionary(logs()[0].second)),
            R"({"Factory Count": 42, "com.velmora.NANDInfo.nandDesc": -2})");
  EXPECT_EQ(plistText(PlistValue::dictionary(logs()[1].second)),
            R"({"Bus": 2, "CE": 3, "CAU": 4, "Block": 5, "Cycle": 6, "Reason": 203, "Page": 7, )"
            R"("Temperature": -128})");
  EXPECT_EQ(logs()[2].second.get("Reason").asInteger(), 3);
  verdict(HandleDefectsList, bytes, plistOf("{}"), "STXStorage");
  EXPECT_EQ(logs()[4].second.get("Reason").asInteger(), 3);
}

TEST_F(StructuredLogsTest, EveryListIsFetchedWhateverBecameOfTheOthers) {
  testing::ScriptedController controller(fake.driverRegistry, kNvme);
  controller.buffers[17] = telemetry(1);
  controller.buffers[15] = words({0, 1, 0});
  EXPECT_FALSE(DumpStorageStructuredLog(fake.platform, true));
  EXPECT_EQ(diagnostics.errors, "failed to create dictionary");
  fake.driverRegistry.drivers[0].properties.set("Controller Characteristics", characteristics());
  controller.requests.clear();
  EXPECT_TRUE(DumpStorageStructuredLog(fake.platform, true));
  EXPECT_EQ(logs().size(), 4U);  // three telemetry lists and the defects
  std::string codesAndFlags;
  for (const auto& request : controller.requests)
    codesAndFlags += std::to_string(std::to_integer<int>(request[0])) + "." +
                     std::to_string(std::to_integer<int>(request[4])) + " ";
  EXPECT_EQ(codesAndFlags, "13.1 13.0 11.3 17.3 17.2 17.7 17.6 17.11 17.10 15.3 15.2 ");
  controller.sizeStatus = kKdBadArgument;
  EXPECT_TRUE(DumpStorageStructuredLog(fake.platform, false));
  controller.sizeStatus = 0;
  controller.dataStatus = kKdBadArgument;
  EXPECT_TRUE(DumpStorageStructuredLog(fake.platform, false));
  for (const char* error : {"KdConnectCallStructMethod failed with status 0xe00002c2 on selector index 4\n",
                            "Could not retrieve data from driver for selector 17\n"})
    EXPECT_THAT(diagnostics.errors, HasSubstr(error));
  fake.driverRegistry.drivers.clear();
  EXPECT_FALSE(DumpStorageStructuredLog(fake.platform, false));
  EXPECT_FALSE(gStorageLogState.gNeedValidityList);
}

TEST_F(StructuredLogsTest, MemoryThatRunsOutCostsOneList) {
  testing::ScriptedController controller(fake.driverRegistry, kNvme);
  controller.buffers[17] = telemetry(1);
  controller.buffers[15] = words({0, 1, 0});
  fake.driverRegistry.drivers[0].properties.set("Controller Characteristics", characteristics());
  std::size_t ended = 0, n = 0;  // runs that ended before the first list
  for (bool wasMet = true; wasMet;) {
    fake.logSubmission.structured.clear();
    const testing::RefusedAllocation refused(++n);
    try {
      DumpStorageStructuredLog(fake.platform, false);
      EXPECT_GE(logs().size(), 3U) << n;
    } catch (const std::bad_alloc&) {
      EXPECT_TRUE(logs().empty()) << n;
      ++ended;
    }
    wasMet = refused.wasMet();
  }
  EXPECT_GT(n, 20 * ended);
}

}  // namespace
}  // namespace tbdaily
