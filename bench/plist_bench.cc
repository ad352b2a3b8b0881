// Property lists: reading both encodings and writing both forms, in bytes of the encoded list a second.
#include <benchmark/benchmark.h>

#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/plist/codec.h"
#include "testing/binary_plist_builder.h"

namespace tbdaily {
namespace {

using Builder = testing::BinaryPlistBuilder;

constexpr std::size_t kScalars = 100'000, kArrays = 2'000, kElements = 5;

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
