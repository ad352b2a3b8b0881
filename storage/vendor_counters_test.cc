#include "storage/vendor_counters.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "storage/storage_test_support.h"

namespace tbdaily {
namespace {

// Every word of the block is another one, none is 0, and the order of their bytes shows.
constexpr std::uint32_t blockWord(std::uint32_t i) {
  return (i + 1) << 8 | 0x5A;
}

NandCounterRecord parsed(NandCounterParser parser) {
  std::array<std::byte, kNandCounterBlockSize> block;
  for (std::uint32_t i = 0; i < 1024; ++i) {
    for (std::uint32_t k = 0; k < 4; ++k) block[4 * i + k] = static_cast<std::byte>(blockWord(i) >> 8 * k);
  }
  NandCounterRecord record;
  parser(block, record);
  return record;
}

TEST(NandCounters, FollowTheLayoutOfTheController) {
  const std::vector<std::pair<NandCounterParser, std::uint64_t>> layouts = {
      {parseCounters1y, 0x95841FE912FE95C3},
      {parseCounters1xSandisk, 0x4635F243086D0DEF},
      {parseCounters1xHynix, 0x626B08811F682406},
      {parseCountersAlgoGeneric, 0x039CF5CA0FFFAD09},
      {parseCountersAlgoGenericQ8, 0x9E14960BE3317C69},
  };
  for (const auto& [parser, sum] : layouts) {
    std::string words;
    for (const std::uint32_t word : parsed(parser).words) words.append(std::to_string(word)).append(",");
    EXPECT_EQ(testing::checksum(words), sum) << words;
  }
}

TEST(NandCounters, AreReportedByKindOfController) {
  const NandCounterRecord record = parsed(parseCountersAlgoGeneric);
  std::size_t next = 0, unused = 1;  // one word belongs to no array
  for (const NandCounterArray& array : nandCounterArrays) {
    if (array.first != next) next += unused--;
    EXPECT_EQ(array.first, next) << array.name;
    next += std::ranges::max(array.counts);
  }
  EXPECT_EQ(next, record.words.size());
  EXPECT_EQ(record.reported(nandCounterArrays[3], ControllerKind::VendorLayouts).size(), 12U);
  EXPECT_EQ(record.reported(nandCounterArrays[9], ControllerKind::Q7A).back(), blockWord(113));
  EXPECT_TRUE(record.reported(nandCounterArrays[10], ControllerKind::Q7A).empty());
}

TEST(NandCounters, ChooseTheLayoutFromTheTextsOfTheController) {
  const std::vector<std::tuple<const char*, const char*, NandCounterParser, const char*>> cases = {
      {"Q7A", "4582603a57ff", parseCountersAlgoGeneric, ""},
      {"Q8A", "ad8252232100", parseCountersAlgoGenericQ8, ""},
      {"q8a", "4582603a57xy", parseCounters1xSandisk,
       "unrecognized hex character: xunrecognized hex character: y"},
      {"Q8AB", "458260DE57", parseCounters1y, ""},  // the missing byte shifts the others
      {"", "458260DE5700", parseCounters1xSandisk, ""},
      {"S5E", "ad82522321ff00000000", parseCounters1xHynix, ""},
      {"S5E", "ad8252232200", parseCounters1y, ""},
      {"S5E", "", parseCounters1y, ""},
      {"S5E", "45", parseCounters1y, ""},
  };
  for (const auto& [chip, manufacturer, parser, said] : cases) {
    testing::CapturedDiagnostics diagnostics;
    const std::uint64_t key = nandVendorKey(manufacturer, diagnostics);
    EXPECT_EQ(nandCounterParser(controllerKind(chip), key), parser) << chip << " " << manufacturer;
    EXPECT_EQ(diagnostics.outputs, said);
    EXPECT_EQ(diagnostics.errors, "");
  }
}

TEST(HexText, IsReadInPairsFromTheLeft) {
  testing::CapturedDiagnostics said;
  const std::vector<std::pair<const char*, std::uint32_t>> numbers = {{"", 0},
                                                                      {"A", 0x0A},
                                                                      {"4582", 0x4582},
                                                                      {"603a57ff", 0x603A57FF},
                                                                      {"abc", 0xAB0C},
                                                                      {"abcde", 0xABCD0E},
                                                                      {"1234567890AB", 0x12345678}};
  for (const auto& [text, number] : numbers) EXPECT_EQ(hexStringToInt32(text, said), number) << text;
  EXPECT_EQ(nandVendorKey("458", said), 0x4508'00000000);
  EXPECT_EQ(hexStringToByte("fF7", said), 0xFF);
  EXPECT_EQ(said.outputs, "");
  EXPECT_EQ(hexStringToByte("G1", said), 0x01);
  EXPECT_EQ(hexStringToByte({"\0\xC3", 2}, said), 0x00);
  EXPECT_EQ(said.outputs, "unrecognized hex character: gunrecognized hex character: " + std::string(1, '\0') +
                              "unrecognized hex character: \xC3");
}

}  // namespace
}  // namespace tbdaily
