// Fuzzer of the property-list codec and of JSON: whatever reads, writes, and what is written in the exact
// form reads back equal.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <span>
#include <string>
#include <string_view>

#include "platform/plist/codec.h"
#include "platform/plist/json.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace tbdaily;
  const auto bytes = std::as_bytes(std::span(data, size));
  PlistCodec codec;
  const PlistParseResult read = codec.parse(bytes);
  if (read.value.isNone() == read.error.empty()) std::abort();
  plistFromJson({reinterpret_cast<const char*>(data), size});
  if (read.value.isNone()) return 0;

  if (!codec.write(read.value, PlistForm::Plain).ok) std::abort();
  const PlistJsonResult json = plistFromJson(jsonText(read.value));
  if (json.value.isNone() && json.error.find("null") == std::string::npos) std::abort();
  const PlistWriteResult written = codec.write(read.value);
  if (!written.ok) return 0;  // text that XML cannot carry
  const std::string_view text = written.bytes;
  const PlistParseResult again = codec.parse(std::as_bytes(std::span(text)));
  if (!(again.value == read.value)) std::abort();
  return 0;
}
