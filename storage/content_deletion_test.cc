#include "storage/content_deletion.h"

#include <gmock/gmock.h>

#include "storage/storage_test_support.h"

namespace tbdaily {
namespace {

struct Answer {
  const char* serviceClass = "STXStorage";
  std::uint8_t lastByte = 1;  // of four, the others are 0
  std::size_t size = 4;
  KdStatus status = kKdSuccess, openStatus = kKdSuccess, closeStatus = kKdSuccess;
};

TEST(NandRecommendsContentDeletion, NeedsAWholeAnswerThatIsNotZero) {
  const std::string noService = "_load_nand_infoCould not get matching KdKit service for exporting classes\n",
                    noConnection = "Could not get connection to service\n",
                    notClosed = "Could not close connection to service\n";
  const std::vector<std::tuple<Answer, bool, int, std::string>> cases = {
      {{}, true, 1, ""},
      {{.lastByte = 0x80, .size = 9}, true, 1, ""},
      {{.lastByte = 0}, false, 1, ""},
      {{.size = 3}, false, 1, ""},
      {{.status = -1}, false, 1, ""},
      {{.closeStatus = -1}, true, 1, notClosed},
      {{.openStatus = -1}, false, 0, noConnection},
      {{.serviceClass = "VelmoraEmbeddedNVMeController"}, false, 0, ""},
      {{.serviceClass = "Other"}, false, 0, noService},
  };
  for (const auto& [answer, recommended, calls, errors] : cases) {
    testing::FakeDriverRegistry registry;
    testing::CapturedDiagnostics said;
    int called = 0;
    registry.drivers.emplace_back().serviceClass = answer.serviceClass;
    registry.openStatus = answer.openStatus;
    registry.closeStatus = answer.closeStatus;
    registry.structMethod = [&, &given = answer](const testing::FakeDriver&, std::uint32_t method, auto input,
                                                 std::span<std::byte> output, std::size_t& size) {
      ++called;
      EXPECT_EQ(method, 5U);
      EXPECT_TRUE(input.empty());
      EXPECT_EQ(size, 4U);
      output[3] = static_cast<std::byte>(given.lastByte);
      size = given.size;
      return given.status;
    };
    EXPECT_EQ(NandRecommendsContentDeletion(registry, said), recommended);
    EXPECT_EQ(called, calls);
    EXPECT_EQ(said.errors + said.outputs, errors);
    EXPECT_EQ(registry.openHandles(), 0U);
  }
}

}  // namespace
}  // namespace tbdaily
