// A PropertyListCodec in memory: written values stay in a table, and the bytes only name their place in it.
#pragma once

#include <algorithm>
#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "platform/property_list_codec.h"

namespace tbdaily::testing {

class FakePropertyListCodec : public PropertyListCodec {
 public:
  // The form of each write so far, failed ones too.
  std::vector<PlistForm> forms;

  void failNextWrite(std::string error) { writeError_ = std::move(error); }

  PlistParseResult parse(std::span<const std::byte> bytes) override {
    std::string text(bytes.size(), '\0');
    std::ranges::transform(bytes, text.begin(), [](std::byte byte) { return static_cast<char>(byte); });
    const auto found = written_.find(text);
    if (found == written_.end()) return {{}, "not a property list"};
    return {found->second, {}};
  }

  PlistWriteResult write(const PlistValue& value, PlistForm form = PlistForm::Exact) override {
    forms.push_back(form);
    if (writeError_) return {false, {}, *std::exchange(writeError_, std::nullopt)};
    if (value.isNone()) return {false, {}, "an absent value cannot be written"};
    std::string bytes = "fake-plist " + std::to_string(written_.size()) + "\n";
    written_.emplace(bytes, value);
    return {true, std::move(bytes), {}};
  }

 private:
  std::map<std::string, PlistValue> written_;
  std::optional<std::string> writeError_;
};

}  // namespace tbdaily::testing
