#include "storage/freezer_writes.h"

#include <gmock/gmock.h>

#include "storage/kcdata_test_support.h"
#include "testing/fake_platform.h"

namespace tbdaily {
namespace {

using Kcdata = testing::KcdataBuffer;

// The written volume, or -1 for the error entries.
std::int64_t writes(const Kcdata& buffer,
                    const std::function<void(testing::FakeStackSnapshot&)>& prepare = {}) {
  testing::FakePlatform fake;
  const auto bytes = std::as_bytes(std::span(buffer.bytes));
  fake.stackSnapshot.bytes.emplace(bytes.begin(), bytes.end());
  if (prepare) prepare(fake.stackSnapshot);
  const PlistDictionary info = CopyVMFreezerNANDInfo(fake.platform);
  EXPECT_EQ(fake.stackSnapshot.configurations, 0);
  const PlistDictionary errors = {{"com.velmora.NANDInfo.VMFreezer.Error", PlistValue::string("1")},
                                  {"com.velmora.NANDInfo.VMFreezer.ErrorMessage",
                                   PlistValue::string("Unable parse snapshot for VMFreezer NAND writes.")}};
  if (info == errors) return -1;
  EXPECT_EQ(info.size(), 1U);
  EXPECT_EQ(fake.stackSnapshot.flags, std::vector<std::uint64_t>{0x10000});
  return info.get("com.velmora.NANDInfo.VMFreezer.NumPhysicalWrites").asInteger().value_or(-2);
}

const std::string kThread =
    Kcdata().begin(2).name(std::string_view("VM_swapout\0rest", 15)).ioStats(77).end(2).bytes;

TEST(FreezerWrites, AreThoseOfTheThreadOfThatName) {
  const std::string name = "VM_swapout";
  const std::vector<std::pair<Kcdata, std::int64_t>> cases = {
      {Kcdata().item(0x11, "x").begin(1).ioStats(5).append(kThread).end(1).bufferEnd(), 77},
      {Kcdata().begin(1).begin(3).name("other").end(3).item(0x2F, "x").append(kThread), 77},
      {Kcdata().begin(1).name(name).ioStats(7, 31).end(1), 0},
      {Kcdata().begin(1).ioStats(~0ULL - 9, 32).name(name + std::string(54, '\0') + "beyond 64").end(1), -10},
      {Kcdata().begin(1).name(name).begin(2).ioStats(5).end(2).end(1), 0},
      {Kcdata().begin(1).name(name).name(name + "s").end(1), -1},
      {Kcdata().begin(1).begin(2).name("other").end(2).end(1).append(kThread), -1},
      {Kcdata().bufferEnd().append(kThread), -1},
      // Ends that are missing, or that close something else.
      {Kcdata().begin(1).end(9).name(name).begin(2).begin(3).end(3), 0},
      {Kcdata().begin(1).begin(2).end(1).name(name).ioStats(6).bufferEnd(), 6},
      {Kcdata().begin(1).begin(2).bufferEnd().append(kThread).end(1), 77},
      {Kcdata().begin(1).item(0x13, "sho", 1).name(name).end(1), 0},
      // Items that do not fit.
      {Kcdata()
           .append(std::string_view("\x13\0\0\0\xFF\xFF\xFF\xFF\0\0\0\0\0\0\0\0kind", 20))
           .append(kThread),
       -1},
      {Kcdata().begin(1).name(name).begin(2).append(std::string_view("\1\0\0\0\1\0\0", 7)), 0},
  };
  for (const auto& [buffer, expected] : cases)
    EXPECT_EQ(writes(buffer), expected) << &buffer - &cases[0].first;
}

TEST(FreezerWrites, NeedASnapshot) {
  const std::function<void(testing::FakeStackSnapshot&)> troubles[] = {
      [](auto& fake) { fake.bytes.reset(); }, [](auto& fake) { fake.flagsStatus = 1; },
      [](auto& fake) { fake.captureStatus = -1; }, [](auto& fake) { fake.givesBuffer = false; }};
  for (const auto& trouble : troubles) EXPECT_EQ(writes(Kcdata().append(kThread), trouble), -1);
}

TEST(FreezerWrites, AreFoundBehindAnyDepthOfNesting) {
  Kcdata deep;
  for (std::uint64_t i = 0; i < 200'000; ++i) deep.begin(i);
  EXPECT_EQ(writes(deep), -1);
  EXPECT_EQ(writes(deep.append(kThread)), 77);
}

}  // namespace
}  // namespace tbdaily
