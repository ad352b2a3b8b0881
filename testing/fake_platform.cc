#include "testing/fake_platform.h"

namespace tbdaily::testing {

// Here and nowhere else, since whoever makes the fakes compiles all of them.
FakePlatform::FakePlatform() = default;
FakePlatform::~FakePlatform() = default;

void FakePlatform::putPlist(std::string_view path, const PlistDictionary& root) {
  const PlistWriteResult written = propertyListCodec.write(PlistValue::dictionary(root));
  propertyListCodec.forms.clear();
  const auto bytes = std::as_bytes(std::span(written.bytes));
  fileSystem.files[std::string(path)] = {bytes.begin(), bytes.end()};
}

PlistValue FakePlatform::plistOf(const FakeLogSubmission::Log& log) {
  return propertyListCodec.parse(std::as_bytes(std::span(log.bytes))).value;
}

}  // namespace tbdaily::testing
