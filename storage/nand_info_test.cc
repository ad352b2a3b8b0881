#include "storage/nand_info.h"

#include <gmock/gmock.h>

#include "platform/preferences_store.h"
#include "storage/nand_key_map.h"
#include "storage/stats_table.h"
#include "storage/storage_test_support.h"
#include "testing/allocations.h"
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
  return NandInfoFromContext(fake.preferences, context, logVariant, fake.diagnostics);
}

PlistDictionary errorInfo(const char* message) {
  return {{"com.velmora.NANDInfo.Error", PlistValue::string("1")},
          {"com.velmora.NANDInfo.ErrorMessage", PlistValue::string(message)}};
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

// "suffix:i1" for a 32-bit and "suffix:l1" for a 64-bit number.
std::string textOf(const PlistDictionary& info) {
  std::string text;
  for (const auto& [key, value] : info) {
    const PlistNumber number = value.asNumber().value();
    text += key.substr(key.rfind('.') + 1) + (number.kind() == NumberKind::SInt32 ? ":i" : ":l") +
            std::to_string(number.toInt64()) + " ";
  }
  return text;
}

TEST(NandInfo, HoldsEachFieldAsFarAsTheExportVersionAllows) {
  const auto info = [](std::uint32_t version, bool logVariant) {
    StatsBuffer buffer = StatsBuffer().record(53, {version}).record(265, {1, 2, 3, 4, 5});
    for (const std::uint32_t id : {4U, 7U, 12U, 13U, 17U, 18U, 19U, 20U, 28U, 45U, 48U})
      buffer.record(id, {0x1'80000000 + std::uint64_t{id}});
    for (const std::uint32_t id : {49U, 50U, 51U, 52U}) buffer.record(id, {0x1'FFFFFF00 + std::uint64_t{id}});
    return textOf(infoOf(buffer, logVariant).value());
  };
  const std::string base =
      "NumVirtualBlocks:i-204 PagesPerVirtualBlock:i-206 BytesPerPage:i-207 NumLogicalReads:l6442450951 "
      "NumLogicalWrites:l6442450948 NumFreeVirtualBlocks:l6442450992 NumWearLevelOps:l6442450961 "
      "NumPhysicalReads:l6442450963 NumPhysicalWrites:l6442450962 NumPhysicalErases:l6442450964 "
      "NodesFree:l6442450956 NodesTotal:l6442450957 ";
  EXPECT_EQ(info(0x20001, true), base);
  EXPECT_EQ(info(0x20001, false), "ExportVersion:i131073 DriverVersion:i-1 DemoMode:l0 " + base);
  EXPECT_EQ(info(0x20002, true),
            base +
                "formatDaysSince2000:l0 NumSleepOps:l6442450972 HighEnduranceBlockEraseCount:l6442450989 "
                "BlocksPerVirtualBlock:i-205 ReadsBeforeErasure0:l1 ReadsBeforeErasure50000:l2 "
                "ReadsBeforeErasure100000:l3 ReadsBeforeErasure150000:l4 ReadsBeforeErasure200000:l5 "
                "NumMaintenanceRequests:l0 MaintenanceRequestsFailedRead:l0 "
                "MaintenanceRequestsFailedProg:l0 MaintenanceRequestsFailedErase:l0 ");
  EXPECT_EQ(infoOf(StatsBuffer()), std::nullopt);
  EXPECT_EQ(infoOf(StatsBuffer(), false).value(), errorInfo("Unsupported export version"));
}

TEST(NandInfo, DerivesItsOwnValues) {
  const std::vector<std::tuple<StatsBuffer, const char*, std::optional<std::int64_t>>> cases = {
      {full().record(56, {946684800 + 604799}), "formatDaysSince2000", 0},
      {full().record(56, {946684800 + 604800}), "formatDaysSince2000", 1},
      {full().record(142, {999}), "maxMemChokeDuration", 999},
      {full().record(142, {1235}), "maxMemChokeDuration", 1240},
      {full().record(142, {9995}), "maxMemChokeDuration", 10000},
      {full().record(142, {(1ULL << 32) + 5}), "maxMemChokeDuration", 5},
      {full().record(188, {12345}), "maxMemExtremeDuration", 12300},
      {full().record(86, {3}).record(85, {0xFFFFFFFF}), "IntermediatePartitionSize", {}},
      {full().record(86, {3}).record(85, {5}), "IntermediatePartitionSize", -2},
      {full().record(269, {4, 100}).record(270, {~0ULL, 100}), "NumMaintenanceRequests", 3},
      {full().record(289, {0, 7, 0, 9}), "MaintenanceRequestsFailedRead", 1},
      {full().record(290, {1, 7, 2, 9}), "MaintenanceRequestsFailedProg", 3},
      {full().record(291, {0, 0, 0, 9}), "MaintenanceRequestsFailedErase", 0},
      {full().record(114, {1, 2, 3, 4, 5}), "BandsPerInternalFlow3", 5},
      {full().record(124, {9}), "ColdestCycle", {}},
  };
  for (const auto& [buffer, suffix, value] : cases)
    EXPECT_EQ(under(infoOf(buffer), suffix), value ? PlistValue::int64(*value) : PlistValue()) << suffix;
}

TEST(NandInfo, IsCopiedFromTheControllerAndMergedIntoALog) {
  FakePlatform fake;
  testing::ScriptedController controller(fake.driverRegistry, "STXStorage");
  controller.buffers[13] = full().bytes;
  for (const auto& [demo, number] : {std::pair(PlistValue::boolean(true), 1), {PlistValue::int32(1), 0}}) {
    fake.preferences.setValue("StoreDemoMode", demo, preference_domain::kDemoSettings);
    EXPECT_EQ(under(CopyNANDInfo(fake.platform), "DemoMode"), PlistValue::int64(number));
  }
  PlistDictionary log = {{"UserWamp", PlistValue::float64(1)}};
  DumpNANDInfo(fake.platform, log);
  controller.buffers[13] = full().word(~0ULL).bytes;
  EXPECT_EQ(CopyNANDInfo(fake.platform), errorInfo("Unable to parse buffer"));
  DumpNANDInfo(fake.platform, log);
  EXPECT_EQ(log.size(), 26U);
}

TEST(NandInfo, HoldsAtMostSixtyKeysWhicheverByteOfItsBufferIsWrong) {
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

TEST(SetNumberValue, LeavesTheDictionaryAsItWasWithoutMemory) {
  PlistDictionary dictionary;
  for (int i = 0; i < 40; ++i) {
    const std::string key = "a key that does not fit into a short text " + std::to_string(i);
    for (std::size_t n = 1; !dictionary.contains(key); ++n) {
      testing::FakeDiagnostics said;
      const PlistDictionary before = dictionary;
      const testing::RefusedAllocation refused(n);
      SetNumberValue(dictionary, key, PlistNumber::int32(i), said);
      if (dictionary.contains(key)) break;
      EXPECT_THAT(said.errors, ::testing::StartsWith("Failed to create PVNumber from value: "));
      EXPECT_EQ(dictionary, before);
      EXPECT_EQ(std::ranges::distance(dictionary), i);
    }
    EXPECT_EQ(dictionary.get(key).asInteger(), i);
  }
}

}  // namespace
}  // namespace tbdaily
