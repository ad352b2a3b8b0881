#include "storage/content_deletion.h"

#include <gmock/gmock.h>

#include "storage/storage_test_support.h"

namespace tbdaily {
namespace {

TEST(NandRecommendsContentDeletion, NeedsAWholeAnswerThatIsNotZero) {
  constexpr const char *kOpening = "Could not get connection to service\n",
                       *kClosing = "method 5\nCould not close connection to service\n",
                       *kNoService =
                           "_load_nand_infoCould not get matching KdKit service for exporting classes\n";
  // Class, last of the four bytes of the answer, its size, statuses of opening, asking and closing.
  const std::vector<std::tuple<const char*, int, std::size_t, std::array<KdStatus, 3>, bool, const char*>>
      cases = {{"STXStorage", 1, 4, {}, true, "method 5\n"},
               {"STXStorage", 0, 4, {}, false, "method 5\n"},
               {"STXStorage", 1, 3, {}, false, "method 5\n"},
               {"STXStorage", 1, 4, {-1}, false, kOpening},
               {"STXStorage", 1, 4, {0, -1, -1}, false, kClosing},
               {"VelmoraEmbeddedNVMeController", 1, 4, {}, false, ""},
               {"Other", 1, 4, {}, false, kNoService}};
  for (const auto& [serviceClass, last, filled, statuses, recommended, events] : cases) {
    testing::FakeDriverRegistry registry;
    testing::FakeDiagnostics said;
    registry.drivers.emplace_back().serviceClass = serviceClass;
    registry.openStatus = statuses[0];
    registry.closeStatus = statuses[2];
    registry.structMethod = [&, byte = std::byte(last), answered = filled, status = statuses[1]](
                                auto&, auto method, auto input, std::span<std::byte> output,
                                std::size_t& size) {
      said.error("method %u\n", method);
      EXPECT_EQ(input.size() + size + output.size(), 0U + 4 + 4);
      output[3] = byte;
      size = answered;
      return status;
    };
    EXPECT_EQ(NandRecommendsContentDeletion(registry, said), recommended);
    EXPECT_EQ(said.errors, events);
    EXPECT_EQ(registry.openHandles(), 0U);
  }
}

}  // namespace
}  // namespace tbdaily
