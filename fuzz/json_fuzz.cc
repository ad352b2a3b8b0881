// JSON as bytes: what reads is the same after a way through JSON, and after one through a property list.
#include "fuzz/input.h"
#include "platform/plist/codec.h"
#include "platform/plist/json.h"

using namespace tbdaily;
using fuzz::require;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const PlistJsonResult read = plistFromJson({reinterpret_cast<const char*>(data), size});
  require(read.value.isNone() != read.error.empty(), "either a value or an error");
  if (read.value.isNone()) return 0;

  for (const JsonLayout layout : {JsonLayout::OneLine, JsonLayout::Indented})
    require(plistFromJson(jsonText(read.value, layout)).value == read.value, "JSON reads back equal");
  PlistCodec codec;
  const PlistWriteResult written = codec.write(read.value);
  if (!written.ok) return 0;  // text that XML cannot carry, or nesting that the codec refuses
  require(codec.parse(std::as_bytes(std::span(written.bytes))).value == read.value,
          "a property list of it reads back equal");
  return 0;
}
