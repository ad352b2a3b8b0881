// Snapshot records as text, by the renderers and by the same pieces through snprintf; both make the same
// text.

#include <benchmark/benchmark.h>

#include <array>
#include <cstdarg>
#include <cstdint>
#include <cstdio>
#include <string_view>
#include <vector>

#include "platform/byte_writer.h"
#include "storage/snapshot_layout.h"
#include "storage/snapshot_renderer.h"

namespace tbdaily {
namespace {

constexpr std::size_t kRecords = 1000;
constexpr std::size_t kRecordWords = kSnapshotRecordSize / 4;
constexpr std::size_t kCapacity = 1 << 20;

std::uint32_t word(std::size_t record, std::size_t index) {
  return static_cast<std::uint32_t>((record + 1) * (index * 37 + 1) % 100000);
}

std::vector<std::byte> records() {
  std::vector<std::byte> bytes;
  for (std::size_t i = 0; i < kRecords * kRecordWords; ++i)
    appendLittleEndian(bytes, word(i / kRecordWords, i % kRecordWords));
  return bytes;
}

void appendField(std::vector<std::byte>& bytes, std::uint32_t kind, std::uint32_t offset, std::uint32_t size,
                 std::string_view format) {
  for (const std::uint32_t value : {kind, offset, size}) appendLittleEndian(bytes, value);
  for (std::size_t i = 0; i < 16; ++i)
    bytes.push_back(i < format.size() ? static_cast<std::byte>(format[i]) : std::byte{0});
}

constexpr std::uint32_t kDescribedValues = 20;

// An empty title, the values of 20 words, a time and both groups of priorities.
std::vector<std::byte> header() {
  std::vector<std::byte> bytes;
  const auto recordSize = std::uint32_t{kSnapshotRecordSize}, slots = std::uint32_t{kRecords + 1};
  for (const std::uint32_t value : {0U, 6U, recordSize, slots, 0U, 0U, 40U, 0U, 0U, 0U})
    appendLittleEndian(bytes, value);
  for (const std::uint32_t value : {kDescribedValues + 3, 0U}) appendLittleEndian(bytes, value);
  for (std::uint32_t i = 0; i < kDescribedValues; ++i) appendField(bytes, 0, 4 * (30 + i), 0, " AB=%4u");
  appendField(bytes, 2, 4 * 39, 0, " TH=%8u.%02u");
  appendField(bytes, 3, 4 * 14, 48, " R%s=");
  appendField(bytes, 3, 4 * 2, 48, " W%s=");
  return bytes;
}

// Groups take their formats as arguments.
#pragma GCC diagnostic ignored "-Wformat-nonliteral"

// Characters at the end of what was printed before.
struct Printed {
  [[gnu::format(printf, 2, 3)]] void operator()(const char* format, ...) {
    std::va_list arguments;
    va_start(arguments, format);
    at += std::vsnprintf(at, static_cast<std::size_t>(end - at), format, arguments);
    va_end(arguments);
  }
  char* at;
  char* end;
};

// The words of a record, copied out as a printing loop would read them.
struct Record {
  explicit Record(std::size_t index) {
    for (std::size_t i = 0; i < kRecordWords; ++i) words[i] = word(index, i);
  }
  std::uint32_t operator[](std::size_t i) const { return words[i]; }
  std::array<std::uint32_t, kRecordWords> words;
};

std::vector<Record> decodedRecords() {
  std::vector<Record> decoded;
  for (std::size_t i = 0; i < kRecords; ++i) decoded.emplace_back(i);
  return decoded;
}

// One value of every priority; the formats are those of the first and of each further one.
struct GroupFormats {
  const char* first;
  const char* further;
};

void printGroup(Printed& print, const Record& r, std::size_t at, const GroupFormats& formats) {
  print(formats.first, r[at]);
  for (std::size_t i = 1; i < 4; ++i) print(formats.further, r[at + 3 * i]);
}

void printDescribedGroups(Printed& print, const Record& r, const char* label, std::size_t at) {
  print(label, "O");
  printGroup(print, r, at, {"%4u", "/%4u"});
  print(label, "L");
  printGroup(print, r, at + 1, {"%7u", "/%7u"});
  print(label, "M");
  printGroup(print, r, at + 2, {"%5u", "/%5u"});
}

// Each writes all records and answers the length of the text, or 0 when it does not fit.

std::size_t renderFixed(const std::vector<std::byte>& bytes, std::vector<char>& text) {
  std::size_t size = text.size();
  return STXParseSnapshotBuffer(bytes, text.data(), size) ? size : 0;
}

std::size_t printFixed(const std::vector<Record>& decoded, std::vector<char>& text) {
  Printed print{text.data(), text.data() + text.size()};
  print("%s", kSnapshotLegend.data());
  for (const Record& r : decoded) {
    print(
        "T=%04u E=%02u HR=%4u HW=%4u NR=%4u NW=%4u TH=%8u.%02u GC=%4u W=%2u BI=%3u BU=%3u V=%5u "
        "BF=%2u/%2u P=%2u H=%2u/%2u X=%2u/%2u L=%3u/%3u C=%2u/%2u S=%4u U=%8u RO=%4u",
        r[0], r[26], r[27], r[28], r[29], r[30], r[39] / 1000, r[39] % 1000 / 10, r[31], r[33], r[36], r[37],
        r[45], r[47], r[48], r[1], r[41], r[40], r[50], r[51], r[43], r[44], r[53], r[54], r[42], r[52],
        r[14]);
    for (std::size_t i = 1; i < 4; ++i) print("/%4u", r[14 + 3 * i]);
    printGroup(print, r, 15, {" RL=%7u", "/%7u"});
    printGroup(print, r, 16, {" RM=%5u", "/%5u"});
    printGroup(print, r, 2, {" WO=%4u", "/%4u"});
    printGroup(print, r, 3, {" WL=%7u", "/%7u"});
    printGroup(print, r, 4, {" WM=%5u", "/%5u"});
    print("\n");
  }
  print("\n");
  return static_cast<std::size_t>(print.at - text.data());
}

std::size_t renderDescribed(const std::vector<std::byte>& bytes, const std::vector<std::byte>& description,
                            std::vector<char>& text) {
  std::size_t size = text.size();
  std::uint32_t cursor = 0;
  return STXParseSnapshotBufferWithInplaceParser(bytes, text.data(), size, description, cursor) ? size - 1
                                                                                                : 0;
}

std::size_t printDescribed(const std::vector<Record>& decoded, std::vector<char>& text) {
  Printed print{text.data(), text.data() + text.size()};
  print("- STX Snapshot - \n%s\n", "");
  for (const Record& r : decoded) {
    for (std::size_t i = 0; i < kDescribedValues; ++i) print(" AB=%4u", r[30 + i]);
    print(" TH=%8u.%02u", r[39] / 1000, r[39] % 1000 / 10);
    printDescribedGroups(print, r, " R%s=", 14);
    printDescribedGroups(print, r, " W%s=", 2);
    print("\n");
  }
  return static_cast<std::size_t>(print.at - text.data());
}

// Runs `render` again and again, if it makes the text that `print` makes.
template <typename Render, typename Print>
void measureRendering(benchmark::State& state, const Render& render, const Print& print) {
  std::vector<char> text(kCapacity), expected(kCapacity);
  const std::string_view rendered(text.data(), render(text));
  if (rendered.empty() || rendered != std::string_view(expected.data(), print(expected)))
    return state.SkipWithError("not the text that snprintf makes");
  for (auto _ : state) {
    benchmark::DoNotOptimize(render(text));
    benchmark::ClobberMemory();
  }
  state.SetItemsProcessed(state.iterations() * std::int64_t{kRecords});
}

template <typename Print>
void measurePrinting(benchmark::State& state, const Print& print) {
  const std::vector<Record> decoded = decodedRecords();
  std::vector<char> text(kCapacity);
  for (auto _ : state) {
    benchmark::DoNotOptimize(print(decoded, text));
    benchmark::ClobberMemory();
  }
  state.SetItemsProcessed(state.iterations() * std::int64_t{kRecords});
}

void fixedLayout(benchmark::State& state) {
  const std::vector<std::byte> bytes = records();
  measureRendering(
      state, [&](std::vector<char>& text) { return renderFixed(bytes, text); },
      [](std::vector<char>& text) { return printFixed(decodedRecords(), text); });
}
BENCHMARK(fixedLayout)->Unit(benchmark::kMicrosecond);

void describedLayout(benchmark::State& state) {
  const std::vector<std::byte> bytes = records(), description = header();
  measureRendering(
      state, [&](std::vector<char>& text) { return renderDescribed(bytes, description, text); },
      [](std::vector<char>& text) { return printDescribed(decodedRecords(), text); });
}
BENCHMARK(describedLayout)->Unit(benchmark::kMicrosecond);

void fixedLayoutThroughSnprintf(benchmark::State& state) {
  measurePrinting(state, printFixed);
}
BENCHMARK(fixedLayoutThroughSnprintf)->Unit(benchmark::kMicrosecond);

void describedLayoutThroughSnprintf(benchmark::State& state) {
  measurePrinting(state, printDescribed);
}
BENCHMARK(describedLayoutThroughSnprintf)->Unit(benchmark::kMicrosecond);

}  // namespace
}  // namespace tbdaily
