#include "platform/plist/codec.h"

#include <exception>

#include "platform/plist/binary_reader.h"
#include "platform/plist/xml_reader.h"
#include "platform/plist/xml_writer.h"

namespace tbdaily {

namespace {
constexpr const char* kOutOfMemory = "out of memory";
}

PlistParseResult PlistCodec::parse(std::span<const std::byte> bytes) {
  try {
    return isBinaryPlist(bytes) ? parseBinaryPlist(bytes) : parseXmlPlist(bytes);
  } catch (const std::exception&) {
    return {{}, kOutOfMemory, true};
  }
}

PlistWriteResult PlistCodec::write(const PlistValue& value, PlistForm form) {
  return writeInPieces(value, form, nullptr);
}

std::string PlistCodec::whyNotPlain(const PlistValue& value) {
  return whyNoPlainXmlPlist(value);
}

PlistWriteResult PlistCodec::writeInPieces(const PlistValue& value, PlistForm form,
                                           const PlistPieceSink& sink) {
  try {
    return writeXmlPlist(value, form, sink);
  } catch (const std::exception&) {
    return {false, {}, kOutOfMemory};
  }
}

}  // namespace tbdaily
