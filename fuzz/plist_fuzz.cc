// Feeds arbitrary bytes to the property-list codec: whatever reads, writes, and what is written in the exact
// form reads back equal. Built as a program of its own with clang, from the top of the tree (bash):
//
//   parts=(plist_{binary_reader,builder,json,scalar_text,xml_reader,xml_writer} property_list_codec)
//   parts+=(base64 utf8 xml_doctype ../number_text ../plist_value)
//   flags="-std=c++20 -g -O1 -fsanitize=fuzzer,address,undefined -I."
//   clang++ $flags fuzz/plist_fuzz.cc $(printf 'platform/linux/%s.cc ' ${parts[@]}) -lexpat -o plist_fuzz
//   ./plist_fuzz -max_len=4096 CORPUS
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
