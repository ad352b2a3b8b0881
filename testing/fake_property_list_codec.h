// The codec itself, which keeps what it was asked and fails when it is told to.
#pragma once

#include <string>
#include <vector>

#include "platform/plist/codec.h"

namespace tbdaily::testing {

class FakePropertyListCodec : public PlistCodec {
 public:
  PlistWriteResult write(const PlistValue& value, PlistForm form = PlistForm::Exact) override {
    forms.push_back(form);
    if (!writeError.empty()) return {false, {}, std::exchange(writeError, {})};
    return PlistCodec::write(value, form);
  }

  std::vector<PlistForm> forms;  // of the writes so far, failed ones too
  std::string writeError;        // of the next one, unless empty
};

}  // namespace tbdaily::testing
