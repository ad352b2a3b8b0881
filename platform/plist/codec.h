// Property lists in the XML and the binary encoding.
#pragma once

#include "platform/property_list_codec.h"

namespace tbdaily {

// No state: may be used from any thread. Running out of memory is a failure like the others.
class PlistCodec : public PropertyListCodec {
 public:
  // The encoding is told by the first bytes. Errors begin with "line L, column C: " (XML) or "byte OFFSET: "
  // (binary).
  PlistParseResult parse(std::span<const std::byte> bytes) override;
  PlistWriteResult write(const PlistValue& value, PlistForm form = PlistForm::Exact) override;
  std::string whyNotPlain(const PlistValue& value) override;
  PlistWriteResult writeInPieces(const PlistValue& value, PlistForm form,
                                 const PlistPieceSink& sink) override;
};

}  // namespace tbdaily
