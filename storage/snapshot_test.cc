#include <gmock/gmock.h>

#include <cstdio>
#include <random>

#include "platform/byte_writer.h"
#include "storage/snapshot_format.h"
#include "storage/snapshot_layout.h"
#include "storage/snapshot_renderer.h"
#include "storage/storage_test_support.h"

namespace tbdaily {
namespace {

struct Bytes : std::vector<std::byte> {
  Bytes& words(const std::vector<std::uint32_t>& values, std::size_t width = 4) {
    for (const std::uint32_t value : values) appendLittleEndian(*this, value, width);
    return *this;
  }
  Bytes& text(std::string_view characters, std::size_t length) {
    resize(size() + length);
    std::ranges::transform(characters, end() - static_cast<std::ptrdiff_t>(length),
                           [](char c) { return static_cast<std::byte>(c); });
    return *this;
  }
};

struct Field {
  std::uint32_t kind, offset, arraySize;
  std::string_view format;
};

Bytes header(std::uint32_t version, std::uint32_t recordSize, std::uint32_t slots,
             const std::vector<Field>& fields, std::uint32_t moreFields = 0) {
  Bytes bytes;
  bytes.words({9, version, recordSize, slots, 9, 9, 44, 9, 9}).text("Title", 8);
  bytes.words({static_cast<std::uint32_t>(fields.size()) + moreFields, 9});
  for (const auto& [kind, offset, arraySize, format] : fields)
    bytes.words({kind, 9}, 2).words({offset, arraySize}).text(format, 16);
  return bytes;
}

// Renders into an allocation of exactly the capacity; by the fixed layout without a header.
struct Rendering {
  Rendering(const Bytes& records, std::size_t capacity, const Bytes* header = nullptr,
            std::uint32_t first = 0)
      : size(capacity), cursor(first) {
    std::vector<char> characters(capacity, '?');
    char* const at = characters.data();
    result = header == nullptr ? STXParseSnapshotBuffer(records, at, size)
                               : STXParseSnapshotBufferWithInplaceParser(records, at, size, *header, cursor);
    text.assign(characters.begin(), std::ranges::find(characters, '\0'));
  }
  std::string text;
  std::size_t size;
  std::uint32_t cursor;
  bool result;
};

const std::vector<std::uint32_t> kExample = {
    1234, 7,  10, 1000, 90, 11, 1001, 91,   12,   1002, 92,  13, 1003, 93, 20, 2000, 80, 21, 2001,  81, 22,
    2002, 82, 23, 2003, 83, 3,  1500, 2500, 1800, 2900, 640, 99, 1,    99, 99, 12,   34, 99, 12345, 0,  2,
    812,  35, 10, 4096, 99, 5,  9,    99,   11,   1,    77,  1,  31,   99, 99, 99,   99, 99, 99,    99, 99};
const std::string kExampleLine =
    "T=1234 E=03 HR=1500 HW=2500 NR=1800 NW=2900 TH=      12.34 GC= 640 W= 1 BI= 12 BU= 34 V= 4096 "
    "BF= 5/ 9 P= 7 H= 2/ 0 X=11/ 1 L= 35/ 10 C= 1/31 S= 812 U=      77 RO=  20/  21/  22/  23 "
    "RL=   2000/   2001/   2002/   2003 RM=   80/   81/   82/   83 WO=  10/  11/  12/  13 "
    "WL=   1000/   1001/   1002/   1003 WM=   90/   91/   92/   93\n";
const std::string kLegend(kSnapshotLegend);

TEST(SnapshotFixedLayout, RendersWholeRecordsInEveryCapacity) {
  // Taken from the legend's documented text by a script.
  EXPECT_EQ(testing::checksum(kLegend), 0xb502d424d3993697);
  for (const std::size_t length : {0U, 251U, 252U, 252U * 3 + 100}) {
    Bytes records;
    for (int i = 0; i < 4; ++i) records.words(kExample);
    records.resize(length);
    std::string full = kLegend;
    for (std::size_t i = 0; i < length / 252; ++i) full += kExampleLine;
    full += "\n";
    for (std::size_t capacity = 0; capacity < full.size() + 3; ++capacity) {
      const Rendering rendering(records, capacity);
      ASSERT_EQ(rendering.result, capacity > full.size());
      ASSERT_EQ(rendering.size, std::min(capacity, full.size()));
      ASSERT_EQ(rendering.text, full.substr(0, capacity == 0 ? 0 : capacity - 1));
    }
  }
}

const std::vector<Field> kFields = {{0, 0, 0, "T=%04u"},    {1, 4, 0, " A=%3d%%"}, {2, 8, 0, " H=%4u.%02u"},
                                    {3, 12, 24, " R%s="},   {3, 12, 11, " N%s"},   {0, 4, 0, ""},
                                    {7, 0, 0, "unknown %u"}};
const Bytes kFourSlots = Bytes().words({1,     0xFFFFFFFF, 12345, 10, 20, 30, 11, 21, 31,      // a record
                                        0,     5,          5,     5,  5,  5,  5,  5,  5,       // an empty one
                                        12345, 7,          999,   1,  2,  3,  4,  5,  123456,  // the last
                                        3,     3,          3,     3,  3,  3,  3,  3,  3});
const std::string kTitle = "- STX Snapshot - \nTitle\n";
const std::string kLine = "T=0001 A= -1% H=  12.34 RO=  10/  11 RL=     20/     21 RM=   30/   31 NO NL NM\n";
const std::string kThirdLine =
    "T=12345 A=  7% H=   0.99 RO=   1/   4 RL=      2/      5 RM=    3/123456 NO NL NM\n";

TEST(SnapshotDescribedLayout, KeepsCompleteLinesInEveryCapacity) {
  const std::string two = kTitle + kLine, all = two + kThirdLine;
  const Bytes description = header(6, 36, 4, kFields);
  for (std::size_t capacity = 0; capacity < all.size() + 3; ++capacity) {
    const Rendering rendering(kFourSlots, capacity, &description);
    const std::string kept = capacity > all.size() ? all : capacity > two.size() ? two : "";
    ASSERT_EQ(rendering.text, kept) << capacity;
    ASSERT_EQ(rendering.size, kept.size() + 1);
    ASSERT_EQ(rendering.cursor, capacity > two.size() ? 3U : capacity > kTitle.size() ? 1U : 0U);
    ASSERT_EQ(rendering.result, capacity > all.size());
  }
}

TEST(SnapshotDescribedLayout, RendersWhatLiesInsideOfAnUntrustedHeader) {
  const std::uint32_t huge = 0xFFFFFFFF;
  const Field one = {0, 0, 0, "T=%u"};
  const struct {
    Bytes header;
    std::uint32_t first, cursor;
    std::string text;
  } cases[] = {
      {header(5, 36, 4, kFields), 0, 3, kLegend + kLine + kThirdLine},
      {header(6, 36, 4, kFields), 3, 3, ""},
      {header(6, 36, 0, {one}), 0, 0, ""},
      {header(6, 0, huge, {one}), 0, huge - 1, ""},
      {header(6, 36, huge, {}), 0, huge - 1, ""},
      {header(6, 36, huge, {one}), 0, huge - 1, kTitle + "T=1\nT=12345\nT=3\n"},
      {header(6, 36, 2, {one}, huge - 1), 0, 1, kTitle + "T=1\n"},
      {header(6, 36, 2, {one, {0, 140, 0, ",%u"}, {2, 141, 0, ",%u"}, {1, huge, 0, "x"}}), 0, 1,
       kTitle + "T=1,3\n"},
      {header(6, 36, 2, {one, {3, 120, huge, ",%s"}}), 0, 1,
       kTitle + "T=1,O   3/   3,L      3/      3,M    3/    3\n"},
      {header(6, 36, 2, {one, {3, huge, huge, ",%s"}}), 0, 1, kTitle + "T=1,O,L,M\n"},
      {header(6, 36, 2, std::vector<Field>(1100, {0, 0, 0, "%u"})), 0, 1,
       kTitle + std::string(1100, '1') + "\n"},
  };
  for (const auto& [bytes, first, cursor, text] : cases) {
    const Rendering rendering(kFourSlots, 4000, &bytes, first);
    EXPECT_TRUE(rendering.result);
    EXPECT_EQ(rendering.text, text);
    EXPECT_EQ(rendering.size, text.size() + 1);
    EXPECT_EQ(rendering.cursor, cursor);
  }
  const Bytes none;
  const Rendering missing(kFourSlots, 5, &none);
  EXPECT_FALSE(missing.result);
  EXPECT_EQ(missing.text + std::to_string(missing.size + missing.cursor), "?????5");
}

using Arguments = SnapshotFormat::Arguments;
constexpr std::array kNumbers = {1U, 2U};
std::string print(std::string_view format, Arguments kind, const auto& arguments) {
  std::array<char, SnapshotFormat::kSize> raw{};
  std::ranges::copy(format, raw.begin());
  std::array<char, 300> text{};
  SnapshotText out(text.data(), text.size());
  SnapshotFormat(raw, kind).append(out, arguments);
  return {text.data(), out.length()};
}

TEST(SnapshotFormat, PrintsAsItStandsWhatItMayNotConvert) {
  std::istringstream values(
      "%n,%s,%p,%c,%f,%lu,%hhd,%*u,%.*u,%1$u,%'u,%,%%%,a%5,%-,%5.,%99999d,%65u,%.65u,%.-1u,%u%u%u,%%%u%u%d,%"
      "u %,"
      "%u3456789abcdef%,0123456789%%cdef");
  std::istringstream texts("%d,%s%s,%n,%65s,%ls,%%%s%,%+#03s|%-3s");
  for (std::string text; std::getline(values, text, ',');)
    EXPECT_EQ(print(text, Arguments::kTwoValues, kNumbers), text);
  for (std::string text; std::getline(texts, text, ',');) EXPECT_EQ(print(text, Arguments::kText, "O"), text);
  EXPECT_EQ(print("%u%u", Arguments::kValue, kNumbers), "%u%u");
  EXPECT_EQ(print("%+#03s|%%", Arguments::kText, "O"), "  O|%");
  EXPECT_EQ(print("123456789abcd%u", Arguments::kTwoValues, kNumbers), "123456789abcd1");
}

#pragma GCC diagnostic ignored "-Wformat-nonliteral"
TEST(SnapshotFormat, AgreesWithPrintf) {
  std::mt19937 random(7);
  std::vector<std::string> formats = {"%-0+ #64.64x", "%u.%02u|%%", "%.0d|%.u", "%#.0o|%+.d", "%#x%#X"};
  while (formats.size() < 20000) {
    std::string& format = formats.emplace_back("%");
    for (auto flags = random() % 4; flags > 0; --flags) format += "-+ #0"[random() % 5];
    if (random() % 2 == 0) format += std::to_string(random() % 65);
    if (random() % 2 == 0) (format += '.') += std::to_string(random() % 65);
    format += "diuoxX"[random() % 6];
  }
  for (const std::string& format : formats) {
    const auto value = static_cast<std::uint32_t>(random() % 4 == 0 ? 0 : random() >> random() % 32);
    std::array<char, 300> expected{};
    std::snprintf(expected.data(), expected.size(), format.c_str(), value, ~value);
    ASSERT_EQ(print(format, Arguments::kTwoValues, std::array{value, ~value}), expected.data()) << format;
  }
}

}  // namespace
}  // namespace tbdaily
