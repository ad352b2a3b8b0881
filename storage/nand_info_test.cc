#include "storage/nand_info.h"

#include <gmock/gmock.h>

#include "platform/preferences_store.h"
#include "storage/nand_key_map.h"
#include "storage/stats_table.h"
#include "storage/storage_test_support.h"
#include "testing/fake_platform.h"

namespace tbdaily {
namespace {

using testing::FakePlatform;
using testing::StatsBuffer;

StatsBuffer full() {
  return StatsBuffer().record(53, {0x20002});
}

std::optional<PlistDictionary> infoOf(const StatsBuffer& buffer, bool logVariant = true) {
  FakePlatform fake;
  StatsContext context;
  STXParseBufferToCxt(context, buffer.bytes);
  return NandInfoFromContext(fake.preferences, context, logVariant);
}

PlistValue under(const std::optional<PlistDictionary>& info, std::string_view suffix) {
  return info.value().get("com.velmora.NANDInfo." + std::string(suffix));
}

// Counts and checksums were taken from the documented map, "name:key\n" a row, by a script that does not read
// the table: first all rows, then those that a buffer can list, in the order of the statistics.
TEST(KeyMap, HoldsEveryRowAndReachesEveryListedName) {
  std::string rows, listed;
  for (const KeyMapRow& row : keyMap) rows += std::string(row.statName) + ":" + std::string(row.key) + "\n";
  for (const StatDefinition& stat : kStats) {
    StatNode node{0, findStat(stat.id).value()};
    for (int element = -1; element < (stat.limit > 1 ? stat.limit : 0); ++element) {
      if (element >= 0) node.element = static_cast<std::uint16_t>(element);
      const std::string key(nandInfoTarget(node).key);
      if (!key.empty()) listed += node.name() + ":" + key + "\n";
    }
  }
  EXPECT_EQ(testing::checksum(rows), 0xf2f55363b5a6c87U);
  EXPECT_EQ(std::ranges::count(listed, '\n'), 317);
  EXPECT_EQ(testing::checksum(listed), 0x484bfd692335a687U);
}

TEST(NandInfo, PutsEachFieldUnderItsKey) {
  constexpr std::array kNarrow = {"49 BytesPerPage", "50 PagesPerVirtualBlock", "51 BlocksPerVirtualBlock",
                                  "52 NumVirtualBlocks"};
  constexpr std::array kWide = {"4 NumLogicalWrites",     "7 NumLogicalReads",
                                "12 NodesFree",           "13 NodesTotal",
                                "17 NumWearLevelOps",     "18 NumPhysicalWrites",
                                "19 NumPhysicalReads",    "20 NumPhysicalErases",
                                "28 NumSleepOps",         "45 HighEnduranceBlockEraseCount",
                                "48 NumFreeVirtualBlocks"};
  const auto check = [](std::string_view field, bool wide) {
    const auto id = static_cast<std::uint32_t>(std::stoul(std::string(field)));
    const std::uint32_t low = 0x80000000 + id;
    const auto info = infoOf(full().record(id, {std::uint64_t{1} << 32 | low}));
    EXPECT_EQ(under(info, field.substr(field.find(' ') + 1)),
              wide ? PlistValue::int64(0x1'80000000 + id) : PlistValue::int32(static_cast<std::int32_t>(low)))
        << field;
  };
  for (const char* field : kNarrow) check(field, false);
  for (const char* field : kWide) check(field, true);
}

TEST(NandInfo, HoldsWhatTheExportVersionAllows) {
  EXPECT_EQ(infoOf(full()).value().size(), 25U);
  const auto whole = infoOf(full(), false);
  EXPECT_EQ(whole.value().size(), 28U);
  EXPECT_EQ(under(whole, "ExportVersion"), PlistValue::int32(0x20002));
  EXPECT_EQ(under(whole, "DriverVersion"), PlistValue::int32(-1));
  EXPECT_EQ(under(whole, "DemoMode"), PlistValue::int64(0));
  const StatsBuffer old = StatsBuffer().record(53, {0x20001}).record(37, {5}).record(28, {5});
  EXPECT_EQ(infoOf(old).value().size(), 12U);
  EXPECT_EQ(infoOf(old, false).value().size(), 15U);
  EXPECT_EQ(infoOf(StatsBuffer()), std::nullopt);
  EXPECT_EQ(under(infoOf(StatsBuffer(), false), "Error"), PlistValue::string("1"));
  EXPECT_EQ(under(infoOf(StatsBuffer(), false), "ErrorMessage"),
            PlistValue::string("Unsupported export version"));
}

TEST(NandInfo, DerivesItsOwnValues) {
  struct Case {
    StatsBuffer buffer;
    const char* suffix;
    std::optional<std::int64_t> value;
  };
  const auto choke = [](std::uint64_t value) { return full().record(142, {value}); };
  const auto formatted = [](std::uint64_t time) { return full().record(56, {time}); };
  const std::vector<Case> cases = {
      {formatted(0), "formatDaysSince2000", 0},
      {formatted(946684799), "formatDaysSince2000", 0},
      {formatted(946684800 + 604799), "formatDaysSince2000", 0},
      {formatted(946684800 + 604800), "formatDaysSince2000", 1},
      {formatted(~0ULL), "formatDaysSince2000", 30500568903377},
      {choke(999), "maxMemChokeDuration", 999},
      {choke(1234), "maxMemChokeDuration", 1230},
      {choke(1235), "maxMemChokeDuration", 1240},
      {choke(9995), "maxMemChokeDuration", 10000},
      {choke(4294967295), "maxMemChokeDuration", 4290000000},
      {choke((1ULL << 32) + 5), "maxMemChokeDuration", 5},
      {full().record(188, {12345}), "maxMemExtremeDuration", 12300},
      {full().record(86, {3}), "IntermediatePartitionSize", {}},
      {full().record(86, {3}).record(85, {0xFFFFFFFF}), "IntermediatePartitionSize", {}},
      {full().record(86, {3}).record(85, {5}), "IntermediatePartitionSize", -2},
      {full(), "NumMaintenanceRequests", 0},
      {full().record(269, {4, 100}).record(270, {~0ULL, 100}), "NumMaintenanceRequests", 3},
      {full().record(289, {0, 7, 0, 9}), "MaintenanceRequestsFailedRead", 1},
      {full().record(290, {1, 7, 2, 9}), "MaintenanceRequestsFailedProg", 3},
      {full().record(291, {0, 0, 0, 9}), "MaintenanceRequestsFailedErase", 0},
      {full().record(114, {1, 2, 3, 4, 5}), "BandsPerInternalFlow3", 5},
      {full().record(124, {9}), "ColdestCycle", {}},
      {full().record(265, {1, 2, 3, 4, ~0ULL}), "ReadsBeforeErasure200000", -1},
  };
  for (const Case& c : cases) {
    EXPECT_EQ(under(infoOf(c.buffer), c.suffix), c.value ? PlistValue::int64(*c.value) : PlistValue())
        << c.suffix;
  }
}

TEST(NandInfo, IsCopiedFromTheControllerAndMergedIntoALog) {
  FakePlatform fake;
  testing::CapturedDiagnostics said;
  testing::ScriptedController controller(fake.driverRegistry, "STXStorage");
  controller.buffers[13] = full().bytes;
  const auto setDemoMode = [&fake](const PlistValue& value) {
    fake.preferences.setValue("StoreDemoMode", value, preference_domain::kDemoSettings);
  };
  setDemoMode(PlistValue::boolean(true));
  EXPECT_EQ(under(CopyNANDInfo(fake.platform, said), "DemoMode"), PlistValue::int64(1));
  setDemoMode(PlistValue::int32(1));
  EXPECT_EQ(under(CopyNANDInfo(fake.platform, said), "DemoMode"), PlistValue::int64(0));
  PlistDictionary log = {{"UserWamp", PlistValue::float64(1)}};
  DumpNANDInfo(fake.platform, log, said);
  EXPECT_EQ(log.size(), 26U);

  controller.buffers[13] = full().word(~0ULL).bytes;
  const PlistDictionary unparsed = {
      {"com.velmora.NANDInfo.Error", PlistValue::string("1")},
      {"com.velmora.NANDInfo.ErrorMessage", PlistValue::string("Unable to parse buffer")}};
  EXPECT_EQ(CopyNANDInfo(fake.platform, said), unparsed);
  PlistDictionary untouched;
  DumpNANDInfo(fake.platform, untouched, said);
  EXPECT_TRUE(untouched.empty());
}

// Every byte of a buffer is made wrong in turn; parser and dictionary come through.
TEST(NandInfo, SurvivesCorruptBuffers) {
  StatsBuffer buffer = full().record(327, std::vector<std::uint64_t>(22, 3)).record(265, {1, 2, 3, 4, 5});
  buffer.record(289, {1, 1, 1, 1}).record(86, {9}).record(85, {4}).record(142, {123456});
  for (std::byte& byte : buffer.bytes) {
    for (const std::byte wrong : {std::byte{0}, std::byte{1}, std::byte{0x7F}, std::byte{0xFF}}) {
      const std::byte right = std::exchange(byte, wrong);
      const auto info = infoOf(buffer);
      EXPECT_LE(info ? info->size() : 0, 60U);
      byte = right;
    }
  }
}

}  // namespace
}  // namespace tbdaily
