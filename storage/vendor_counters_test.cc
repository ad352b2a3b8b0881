#include "storage/vendor_counters.h"

#include <gmock/gmock.h>

#include "storage/storage_test_support.h"

namespace tbdaily {
namespace {

TEST(NandCounters, FollowTheLayoutOfTheController) {
  std::array<std::byte, kNandCounterBlockSize> block;
  for (std::uint32_t i = 0; i < block.size(); ++i)  // word i is (i + 1) << 8 | 0x5A
    block[i] = static_cast<std::byte>(i % 4 == 0 ? 0x5A : (i / 4 + 1) << 8 >> i % 4 * 8);
  const std::vector<std::pair<NandCounterParser, std::uint64_t>> layouts = {
      {parseCounters1y, 0x95841FE912FE95C3},
      {parseCounters1xSandisk, 0x4635F243086D0DEF},
      {parseCounters1xHynix, 0x626B08811F682406},
      {parseCountersAlgoGeneric, 0x039CF5CA0FFFAD09},
      {parseCountersAlgoGenericQ8, 0x9E14960BE3317C69}};
  for (const auto& [parser, sum] : layouts) {
    NandCounterRecord record;
    parser(block, record);
    std::string words;
    for (const std::uint32_t word : record.words) words.append(std::to_string(word)).append(",");
    EXPECT_EQ(testing::checksum(words), sum) << words;
    EXPECT_EQ(record.reported(nandCounterArrays[3], ControllerKind::Q8A).data(), &record.words[65]);
    EXPECT_EQ(record.reported(nandCounterArrays[9], ControllerKind::Q8A).size(), 0U);
  }
}

TEST(NandCounters, ChooseTheLayoutFromTheTextsOfTheController) {
  const std::vector<std::tuple<const char*, const char*, NandCounterParser>> cases = {
      {"Q7A", "4582603a57ff", parseCountersAlgoGeneric},
      {"Q8A", "ad8252232100", parseCountersAlgoGenericQ8},
      {"q8a", "4582603a57xy", parseCounters1xSandisk},
      {"Q8AB", "458260DE5700", parseCounters1xSandisk},
      {"", "ad82522321ff00000000", parseCounters1xHynix},
      {"", "ad8252232200", parseCounters1y},
      {"", "458260DE57", parseCounters1y},
      {"", "", parseCounters1y}};
  testing::FakeDiagnostics said;
  for (const auto& [chip, manufacturer, parser] : cases)
    EXPECT_EQ(nandCounterParser(controllerKind(chip), nandVendorKey(manufacturer, said)), parser);
  EXPECT_EQ(said.outputs, "unrecognized hex character: xunrecognized hex character: y");
}

}  // namespace
}  // namespace tbdaily
