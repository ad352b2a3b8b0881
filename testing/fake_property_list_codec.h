// The codec itself, which keeps what it was asked and fails when it is told to.
#pragma once

#include <string>
#include <vector>

#include "platform/plist/codec.h"

namespace tbdaily::testing {

class FakePropertyListCodec : public PlistCodec {
 public:
  std::string whyNotPlain(const PlistValue& value) override {
    return fault.empty() ? PlistCodec::whyNotPlain(value) : std::exchange(fault, {});
  }
  PlistWriteResult writeInPieces(const PlistValue& value, PlistForm form,
                                 const PlistPieceSink& sink) override {
    forms.push_back(form);
    return PlistCodec::writeInPieces(value, form, sink);
  }

  std::vector<PlistForm> forms;  // of the writes so far
  std::string fault;             // of the next value that is asked about, unless empty
};

}  // namespace tbdaily::testing
