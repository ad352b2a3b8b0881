// Property lists as bytes: whatever reads, writes; what is written in the exact form reads back equal, and
// the other forms stay as they are from then on.
#include "fuzz/input.h"
#include "platform/plist/codec.h"
#include "platform/plist/json.h"

using namespace tbdaily;
using fuzz::require;

namespace {

PlistCodec codec;

PlistValue parsed(const std::string& bytes) {
  const PlistParseResult read = codec.parse(std::as_bytes(std::span(bytes)));
  require(!read.value.isNone(), "what the codec wrote, it reads");
  return read.value;
}

void writesTheSameAgain(const PlistValue& value, PlistForm form) {
  const PlistWriteResult written = codec.write(value, form);
  require(written.ok && written.error.empty(), "what was read can be written");
  require(codec.write(parsed(written.bytes), form).bytes == written.bytes,
          "written again, the bytes are the same");
}

void survivesJson(const PlistValue& value) {
  const std::string text = jsonText(value);
  const PlistJsonResult read = plistFromJson(text);
  if (read.value.isNone()) {
    require(read.error.find("null") != std::string::npos, "JSON reads back, but for null");
    return;
  }
  require(plistFromJson(jsonText(value, JsonLayout::Indented)).value == read.value,
          "both layouts read the same");
  require(plistFromJson(jsonText(read.value)).value == read.value, "JSON reads back equal");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const PlistParseResult read = codec.parse(std::as_bytes(std::span(data, size)));
  require(read.value.isNone() != read.error.empty(), "either a value or an error");
  if (read.value.isNone()) return 0;

  writesTheSameAgain(read.value, PlistForm::Plain);
  writesTheSameAgain(read.value, PlistForm::Carried);
  survivesJson(read.value);
  const PlistWriteResult exact = codec.write(read.value);
  require(exact.ok == exact.error.empty(), "either bytes or an error");
  if (exact.ok) require(parsed(exact.bytes) == read.value, "the exact form reads back equal");
  return 0;
}
