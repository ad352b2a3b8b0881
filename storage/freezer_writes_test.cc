#include "storage/freezer_writes.h"

#include <gmock/gmock.h>

#include <random>

#include "storage/kcdata_test_support.h"
#include "testing/fake_platform.h"

namespace tbdaily {
namespace {

using Kcdata = testing::KcdataBuffer;

const PlistDictionary kErrors = {{"com.velmora.NANDInfo.VMFreezer.Error", PlistValue::string("1")},
                                 {"com.velmora.NANDInfo.VMFreezer.ErrorMessage",
                                  PlistValue::string("Unable parse snapshot for VMFreezer NAND writes.")}};

std::vector<std::byte> copyOf(std::string_view text) {
  const auto bytes = std::as_bytes(std::span(text));
  return {bytes.begin(), bytes.end()};
}

// The written volume, or -1 for the error entries.
std::int64_t writes(const Kcdata& buffer) {
  testing::FakePlatform fake;
  fake.stackSnapshot.bytes = copyOf(buffer.bytes);
  const PlistDictionary info = CopyVMFreezerNANDInfo(fake.platform);
  EXPECT_EQ(fake.stackSnapshot.configurations, 0);
  EXPECT_EQ(fake.stackSnapshot.flags, std::vector<std::uint64_t>{0x10000});
  if (info == kErrors) return -1;
  EXPECT_EQ(info.size(), 1U);
  return info.get("com.velmora.NANDInfo.VMFreezer.NumPhysicalWrites").asInteger().value_or(-2);
}

Kcdata thread(std::uint64_t written) {
  return Kcdata().begin(2).name(std::string_view("VM_swapout\0rest", 15)).ioStats(written).end(2);
}

TEST(FreezerWrites, AreThoseOfTheThreadOfThatName) {
  const std::string found = thread(77).bytes, kName = "VM_swapout";
  const std::vector<std::pair<Kcdata, std::int64_t>> cases = {
      {Kcdata().item(0x11, "x").begin(1).ioStats(5).append(found).end(1).bufferEnd(), 77},
      {Kcdata().begin(1).begin(3).name("other").end(3).item(0x2F, "x").append(found), 77},
      {Kcdata().begin(1).name(kName).end(1), 0},
      {Kcdata().begin(1).name(kName).ioStats(7, 31).end(1), 0},
      {Kcdata().begin(1).ioStats(~0ULL - 9, 32).name(kName + std::string(70, '\0')).end(1), -10},
      {Kcdata().begin(1).name(kName).begin(2).ioStats(5).end(2).end(1), 0},
      {Kcdata().begin(1).name(kName + "s").end(1), -1},
      {Kcdata().begin(1).name(kName).name("other").end(1), -1},
      {Kcdata().begin(1).begin(2).name("other").end(2).end(1).append(found), -1},
      {Kcdata().bufferEnd().append(found), -1},
      {Kcdata(), -1},
      // Ends that are missing, or that close something else.
      {Kcdata().begin(1).end(9).name(kName).begin(2).begin(3).end(3), 0},
      {Kcdata().begin(1).begin(2).end(1).name(kName).ioStats(6).bufferEnd(), 6},
      {Kcdata().begin(1).begin(2).bufferEnd().append(found).end(1), 77},
      {Kcdata().begin(1).bufferEnd().append(found), -1},
      {Kcdata().begin(1).item(0x13, "sho", 1).name(kName).end(1), 0},
      // Items that do not fit.
      {Kcdata().append(std::string_view("\x13\0\0\0\xFF\xFF\xFF\xFF\0\0\0\0\0\0\0\0kind", 20)).append(found),
       -1},
      {Kcdata().begin(1).name(kName).begin(2).append(std::string_view("\1\0\0\0\1\0\0", 7)), 0},
  };
  for (const auto& [buffer, expected] : cases)
    EXPECT_EQ(writes(buffer), expected) << &buffer - &cases[0].first;
}

TEST(FreezerWrites, NeedASnapshot) {
  const std::vector<std::function<void(testing::FakeStackSnapshot&)>> faults = {
      [](auto& fake) { fake.bytes.reset(); }, [](auto& fake) { fake.flagsStatus = 1; },
      [](auto& fake) { fake.captureStatus = -1; }, [](auto& fake) { fake.givesBuffer = false; }};
  for (const auto& fault : faults) {
    testing::FakePlatform fake;
    fake.stackSnapshot.bytes = copyOf(thread(1).bytes);
    fault(fake.stackSnapshot);
    EXPECT_EQ(CopyVMFreezerNANDInfo(fake.platform), kErrors);
    EXPECT_EQ(fake.stackSnapshot.configurations, 0);
  }
}

TEST(KcdataWalk, StopsAtTheEndOfItsContainerAndComparesNamesUpToTheirLimit) {
  const Kcdata buffer = Kcdata().begin(1).name(std::string(80, 'a')).ioStats(1).end(1).begin(2);
  const auto bytes = std::as_bytes(std::span(buffer.bytes));
  const auto search = [&](std::string_view name) {
    KcdataIOStats ioStats;
    std::size_t cursor = 1;
    const bool found = getIOStatsWithThreadnameFromKCDataHelper(bytes, name, ioStats, &cursor);
    EXPECT_EQ(ioStats ? ioStats->size() : 0, found ? 40U : 0U);
    return std::pair(found, cursor);
  };
  EXPECT_EQ(search(std::string(64, 'a') + "bc"), std::pair(true, std::size_t{20 + 96 + 56}));
  EXPECT_EQ(search(std::string(63, 'a') + "b"), std::pair(false, std::size_t{20 + 96 + 56}));
  EXPECT_EQ(search({}), std::pair(false, std::size_t{0}));
}

TEST(KcdataWalk, SurvivesDeepNestingAndDamage) {
  Kcdata deep;
  for (std::uint64_t i = 0; i < 200'000; ++i) deep.begin(i);
  EXPECT_EQ(writes(deep), -1);
  EXPECT_EQ(writes(deep.append(thread(8).bytes)), 8);

  const Kcdata whole = Kcdata().begin(1).begin(3).name("n").end(3).append(thread(9).bytes).end(1);
  std::mt19937 random(1);
  for (std::size_t length = 0; length < whole.bytes.size(); ++length) {
    Kcdata damaged;
    damaged.append(std::string_view(whole.bytes).substr(0, length));
    writes(damaged);
    damaged.append(std::string_view(whole.bytes).substr(length));
    damaged.bytes[length] = static_cast<char>(random());
    writes(damaged);
  }
}

}  // namespace
}  // namespace tbdaily
