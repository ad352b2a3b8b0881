// Property lists: reading both encodings, beside the least that any reader does, and writing both forms; in
// bytes of the encoded list a second.
#include <benchmark/benchmark.h>
#include <expat.h>

#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/plist/codec.h"
#include "platform/utf8.h"
#include "testing/binary_plist_builder.h"

namespace tbdaily {
namespace {

using Builder = testing::BinaryPlistBuilder;

constexpr std::size_t kScalars = 195'000, kArrays = 2'000, kElements = 5;

std::string keyOf(std::size_t i) {
  return "com.example.metric.group" + std::to_string(i % 37) + ".name" + std::to_string(i);
}

// One dictionary of scalars, integers and reals in turn.
PlistValue scalars() {
  PlistDictionary entries;
  for (std::size_t i = 0; i < kScalars; ++i) {
    const auto number = static_cast<std::int64_t>(i * 7919);
    entries.set(keyOf(i), i % 4 == 0 ? PlistValue::float64(static_cast<double>(number) / 3)
                                     : PlistValue::int64(number));
  }
  return PlistValue::dictionary(std::move(entries));
}

// One dictionary of arrays, each a text and numbers.
PlistValue arrays() {
  PlistDictionary entries;
  for (std::size_t i = 0; i < kArrays; ++i) {
    PlistArray elements{PlistValue::string("state " + std::to_string(i % 11))};
    while (elements.size() < kElements)
      elements.push_back(PlistValue::int64(static_cast<std::int64_t>(i * elements.size())));
    entries.set(keyOf(i), PlistValue::array(std::move(elements)));
  }
  return PlistValue::dictionary(std::move(entries));
}

std::size_t addObject(Builder& builder, const PlistValue& value) {
  if (const auto text = value.asString()) return builder.add(Builder::ascii(*text));
  if (const auto integer = value.asInteger()) return builder.add(Builder::integer(*integer));
  if (const auto number = value.asNumber()) return builder.add(Builder::real(number->toDouble()));
  std::vector<std::size_t> references;
  for (const PlistValue& element : *value.asArray()) references.push_back(addObject(builder, element));
  return builder.add(Builder::array(references));
}

std::string binaryOf(const PlistDictionary& entries) {
  Builder builder;
  builder.add("");
  std::vector<std::size_t> keys, values;
  for (const auto& [key, value] : entries) {
    keys.push_back(builder.add(Builder::ascii(key)));
    values.push_back(addObject(builder, value));
  }
  builder.replace(0, Builder::dictionary(keys, values));
  return builder.build();
}

void countBytes(benchmark::State& state, std::size_t size) {
  state.SetBytesProcessed(static_cast<std::int64_t>(size) * state.iterations());
}

void read(benchmark::State& state, std::string_view bytes) {
  PlistCodec codec;
  for (auto _ : state) {
    const PlistParseResult result = codec.parse(std::as_bytes(std::span(bytes)));
    if (!result.error.empty()) state.SkipWithError(result.error.c_str());
  }
  countBytes(state, bytes.size());
}

void write(benchmark::State& state, const PlistValue& value, PlistForm form) {
  PlistCodec codec;
  std::size_t size = 0;
  for (auto _ : state) {
    const PlistWriteResult result = codec.write(value, form);
    if (!result.ok) state.SkipWithError(result.error.c_str());
    size = result.bytes.size();
  }
  countBytes(state, size);
}

void readXml(benchmark::State& state, PlistValue (*make)()) {
  read(state, PlistCodec().write(make()).bytes);
}
void readBinary(benchmark::State& state, PlistValue (*make)()) {
  read(state, binaryOf(*make().asDictionary()));
}
void writePlain(benchmark::State& state, PlistValue (*make)()) {
  write(state, make(), PlistForm::Plain);
}
void writeExact(benchmark::State& state, PlistValue (*make)()) {
  write(state, make(), PlistForm::Exact);
}

// The peer of readXml: expat with handlers that do nothing but count.
void expatAlone(benchmark::State& state, PlistValue (*make)()) {
  const std::string bytes = PlistCodec().write(make()).bytes;
  std::size_t elements = 0;
  for (auto _ : state) {
    elements = 0;
    const XML_Parser parser = XML_ParserCreate("UTF-8");
    XML_SetUserData(parser, &elements);
    XML_SetElementHandler(
        parser, [](void* count, const XML_Char*, const XML_Char**) { ++*static_cast<std::size_t*>(count); },
        [](void*, const XML_Char*) {});
    XML_SetCharacterDataHandler(parser, [](void*, const XML_Char*, int) {});
    if (XML_Parse(parser, bytes.data(), static_cast<int>(bytes.size()), XML_TRUE) != XML_STATUS_OK)
      state.SkipWithError("not well-formed");
    XML_ParserFree(parser);
  }
  if (elements != 2 + 2 * make().asDictionary()->size())
    state.SkipWithError("other elements than were written");
  countBytes(state, bytes.size());
}

// The peer of readBinary: a pass over the objects of the dictionary in order, with the checks that each
// reader owes to hostile bytes, which keeps nothing.
class CheckedPass {
 public:
  explicit CheckedPass(std::string_view bytes) : bytes_(bytes) {
    if (bytes.size() < 40 || !bytes.starts_with("bplist00")) return;
    const std::string_view trailer = bytes.substr(bytes.size() - 32);
    offsetSize_ = static_cast<unsigned char>(trailer[6]);
    referenceSize_ = static_cast<unsigned char>(trailer[7]);
    objects_ = number(bytes.size() - 24, 8);
    table_ = number(bytes.size() - 8, 8);
    const std::uint64_t root = number(bytes.size() - 16, 8);
    if (table_ > bytes.size() - 32 || objects_ > (bytes.size() - 32 - table_) / offsetSize_) return;
    dictionary(root);
  }
  // 0 where something does not hold.
  std::size_t entries() const { return entries_; }

 private:
  std::uint64_t number(std::uint64_t at, std::size_t size) const {
    std::uint64_t value = 0;
    for (std::size_t i = 0; i < size; ++i) value = value << 8 | static_cast<unsigned char>(bytes_[at + i]);
    return value;
  }
  // Where an object lies; past the end for a reference to none.
  std::uint64_t placeOf(std::uint64_t object) const {
    return object < objects_ ? number(table_ + object * offsetSize_, offsetSize_) : bytes_.size();
  }
  bool takeCount(std::uint64_t& at, std::uint64_t& count) const {
    count = static_cast<unsigned char>(bytes_[at]) & 0x0F;
    ++at;
    if (count != 0x0F) return true;
    const std::size_t size = std::size_t{1} << (static_cast<unsigned char>(bytes_[at]) & 0x03);
    if (at + 1 + size > table_) return false;
    count = number(at + 1, size);
    at += 1 + size;
    return true;
  }
  bool isSound(std::uint64_t object) const {
    std::uint64_t at = placeOf(object), count = 0;
    if (at >= table_) return false;
    const unsigned kind = static_cast<unsigned char>(bytes_[at]) >> 4;
    if (kind == 1 || kind == 2) return at + 1 + (std::size_t{1} << (bytes_[at] & 0x07)) <= table_;
    if (kind != 5 || !takeCount(at, count) || count > table_ - at) return false;
    return isUtf8(bytes_.substr(at, count));
  }
  void dictionary(std::uint64_t root) {
    std::uint64_t at = placeOf(root), count = 0;
    if (at >= table_ || static_cast<unsigned char>(bytes_[at]) >> 4 != 0x0D || !takeCount(at, count)) return;
    if (count > (table_ - at) / (2 * referenceSize_)) return;
    for (std::uint64_t i = 0; i < count; ++i) {
      if (!isSound(number(at + i * referenceSize_, referenceSize_)) ||
          !isSound(number(at + (count + i) * referenceSize_, referenceSize_)))
        return;
    }
    entries_ = count;
  }

  std::string_view bytes_;
  std::size_t offsetSize_ = 1, referenceSize_ = 1;
  std::uint64_t objects_ = 0, table_ = 0;
  std::size_t entries_ = 0;
};

void checkedPass(benchmark::State& state, PlistValue (*make)()) {
  const std::string bytes = binaryOf(*make().asDictionary());
  for (auto _ : state) {
    if (CheckedPass(bytes).entries() != kScalars) state.SkipWithError("other entries than were written");
  }
  countBytes(state, bytes.size());
}

// What bounds readBinary: its dictionary made of keys and numbers that are at hand, and released.
void dictionaryAlone(benchmark::State& state, PlistValue (*make)()) {
  const PlistValue whole = make();
  const PlistDictionary& source = *whole.asDictionary();
  for (auto _ : state) {
    std::vector<PlistDictionary::Entry> entries;
    entries.reserve(source.size());
    for (const auto& [key, value] : source) entries.emplace_back(key, value);
    benchmark::DoNotOptimize(PlistDictionary(std::move(entries)).size());
  }
}

BENCHMARK_CAPTURE(dictionaryAlone, scalars, scalars)->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(expatAlone, scalars, scalars)->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(checkedPass, scalars, scalars)->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(readXml, scalars, scalars)->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(readXml, arrays, arrays)->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(readBinary, scalars, scalars)->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(readBinary, arrays, arrays)->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(writePlain, scalars, scalars)->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(writePlain, arrays, arrays)->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(writeExact, scalars, scalars)->Unit(benchmark::kMillisecond);
BENCHMARK_CAPTURE(writeExact, arrays, arrays)->Unit(benchmark::kMillisecond);

}  // namespace
}  // namespace tbdaily
