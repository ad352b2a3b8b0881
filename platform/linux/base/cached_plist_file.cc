#include "platform/linux/base/cached_plist_file.h"

#include <cerrno>

#include "platform/linux/base/host_notes.h"

namespace tbdaily {

void CachedPlistFile::refresh(const std::filesystem::path& place, PropertyListCodec& codec) {
  const auto identity = fileIdentity(place);
  if (!identity) {
    *this = {};
  } else if (identity != identity_) {
    read(place, codec);
  }
}

void CachedPlistFile::read(const std::filesystem::path& place, PropertyListCodec& codec) {
  *this = {};
  forget();  // what cannot be read is tried again
  FileContents contents;
  if (const int error = readRegularFile(place, contents); error != 0) {
    state_ = error == ENOENT ? State::Missing : State::Unreadable;
    fault_ = errorText(error);
    return;
  }
  identity_ = contents.identity;
  PlistParseResult parsed = codec.parse(contents.bytes);
  if (parsed.value.asDictionary() != nullptr) {
    state_ = State::Readable;
    root_ = std::move(parsed.value);
    return;
  }
  state_ = State::Damaged;
  fault_ = parsed.error.empty() ? "its root is no dictionary" : std::move(parsed.error);
}

}  // namespace tbdaily
