#include "storage/storage_connection.h"

#include <gmock/gmock.h>

#include <new>

#include "storage/storage_test_support.h"

namespace {
bool memoryIsOut = false;
}

// Buffers for a driver are the only allocations of this kind; here they fail when asked to.
void* operator new(std::size_t size, std::align_val_t alignment, const std::nothrow_t&) noexcept {
  return memoryIsOut ? nullptr : ::operator new(size, alignment);
}

namespace tbdaily {
namespace {

using ::testing::ElementsAre;
using testing::StatsBuffer;

TEST(StxRequest, HasItsLayout) {
  constexpr STXSelectorPair kPair = {0x01020304, 0xA1B2C3D4};
  EXPECT_EQ(StxRequest::sizeQuery(kPair).flags, 1);
  const auto bytes = StxRequest::dataFetch(kPair, {2, true}).bytes();
  EXPECT_EQ(ByteReader(bytes).at<std::uint64_t>(0), 0xA'A1B2C3D4);
  EXPECT_EQ(std::ranges::count(bytes, std::byte{0}), 19);
  EXPECT_EQ(StxRequest::sizeQuery(kPair, {0xFFFF, false}).flags, 0x3FD);
}

struct Fetch {
  explicit Fetch(const char* serviceClass = "STXStorage") : controller(registry, serviceClass) {
    for (const std::uint32_t code : {0U, 1U, 2U, 13U})
      controller.buffers[code] = StatsBuffer().record(53, {0x20002}).record(4, {77}).bytes;
  }
  ~Fetch() { EXPECT_EQ(registry.openHandles(), 0U); }
  bool run(NandExporterTable exporters = nand_exporters) {
    return FetchStatsContext(registry, descriptor, context, said, exporters);
  }

  testing::FakeDriverRegistry registry;
  testing::ScriptedController controller;
  const NandExporter* descriptor = nullptr;
  StatsContext context;
  testing::FakeDiagnostics said;
};

TEST(FetchStatsContext, AsksEachControllerThroughItsOwnMethods) {
  Fetch first, second("VelmoraEmbeddedNVMeController"), none("Other");
  EXPECT_TRUE(first.run() && second.run());
  EXPECT_EQ(first.descriptor, &nand_exporters[0]);
  EXPECT_EQ(second.descriptor, &nand_exporters[1]);
  EXPECT_THAT(first.controller.methods, ElementsAre(8, 8));
  EXPECT_THAT(second.controller.methods, ElementsAre(9, 9));
  EXPECT_EQ(first.context.hostWrites, 77U);
  EXPECT_FALSE(none.run());
  EXPECT_EQ(none.descriptor, &nand_exporters[2]);
  EXPECT_EQ(none.said.errors, "Could not get matching KdKit service for exporting classes\n");
}

TEST(FetchStatsContext, TellsEachTroubleAndReleasesEverything) {
  const std::vector<std::tuple<std::function<void(Fetch&)>, bool, const char*>> cases = {
      {[](Fetch& f) { f.registry.openStatus = -1; }, false, "Could not get connection to service\n"},
      {[](Fetch& f) { f.controller.sizeStatus = -2; }, false, "KdConnectCallStructMethod: -2"},
      {[](Fetch& f) { f.controller.sizeAnswer = 0xFFFFFFFF, memoryIsOut = true; }, false,
       "Could not valloc 4294967295 bytes"},
      {[](Fetch& f) { f.controller.dataStatus = f.registry.closeStatus = -1; }, false,
       "Could not retrieve data from driver for selector d\nCould not close connection to service\n"},
      {[](Fetch& f) { f.registry.closeStatus = -1; }, true, "Could not close connection to service\n"},
      // Sizes and fills that are not what they should be.
      {[](Fetch& f) { f.controller.sizeAnswer = 0; }, false, ""},
      {[](Fetch& f) { f.controller.sizeAnswer = 0xFFFFFFFF; }, true, ""},
      {[](Fetch& f) { f.controller.filled = 16; }, true, ""},
      {[](Fetch& f) { f.controller.filled = 24; }, false, ""},
      {[](Fetch& f) { f.controller.filled = 1 << 20; }, true, ""},
  };
  for (const auto& [prepare, fetched, errors] : cases) {
    Fetch fetch;
    prepare(fetch);
    EXPECT_EQ(fetch.run(), fetched) << errors;
    EXPECT_EQ(fetch.said.errors, errors);
    memoryIsOut = false;
  }
}

TEST(FetchStatsContext, FollowsTheSelectorsOfTheDescriptor) {
  static constexpr STXSelectorPair kUnserved = {kNoSelector, 13};
  for (const SelectorGetter getter : {SelectorGetter([]() -> const STXSelectorPair* { return nullptr; }),
                                      SelectorGetter([] { return &kUnserved; })}) {
    std::array<NandExporter, 2> table = {nand_exporters[0], {}};
    table[0].statsSelectors = getter;
    Fetch fetch;
    EXPECT_FALSE(fetch.run(table));
    EXPECT_TRUE(fetch.controller.requests.empty());
  }
}

TEST(StxConnection, OpensAndClosesByHand) {
  Fetch fetch, none("Other");
  StxConnection connection;
  EXPECT_TRUE(openSTXConnection(fetch.registry, connection, fetch.said));
  EXPECT_EQ(fetch.registry.openHandles(), 2U);
  closeSTXConnection(fetch.registry, connection);
  EXPECT_FALSE(openSTXConnection(none.registry, connection, none.said));
  EXPECT_EQ(FlashConnect(none.registry, none.descriptor, none.said), 0U);
  EXPECT_EQ(none.said.errors, "Can't get STX Connection, no matching service!\nNo class found");

  FlashDisconnect(fetch.registry, 99, fetch.said);
  fetch.registry.openStatus = kKdBadArgument;
  EXPECT_FALSE(openSTXConnection(fetch.registry, connection, fetch.said));
  EXPECT_EQ(fetch.said.errors,
            "closing connection to service failed\n"
            "KdServiceOpen failed for class 'STXStorage', result 0xe00002c2\nCan't get STX Connection!\n");
}

}  // namespace
}  // namespace tbdaily
