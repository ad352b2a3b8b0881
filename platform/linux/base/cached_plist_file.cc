#include "platform/linux/base/cached_plist_file.h"

#include <cerrno>

#include "platform/linux/base/host_notes.h"

namespace tbdaily {

void CachedPlistFile::refresh(const DeviceFiles& files, const std::string& path, PropertyListCodec& codec) {
  if (identity_ == FileIdentity{} || !files.isUnchanged(path, identity_)) read(files, path, codec);
}

void CachedPlistFile::read(const DeviceFiles& files, const std::string& path, PropertyListCodec& codec) {
  *this = {};
  FileContents contents;
  if (const int error = files.readFile(path, contents); error != 0) {
    state_ = error == ENOENT || error == kUnusableRoot ? State::Missing : State::Unreadable;
    fault_ = errorText(error);
    return;
  }
  PlistParseResult parsed = codec.parse(contents.bytes);
  if (parsed.ranOutOfMemory) {  // not damaged, and worth another look
    state_ = State::Unreadable;
    ranOutOfMemory_ = true;
    fault_ = std::move(parsed.error);
    return;
  }
  identity_ = contents.identity;
  if (parsed.value.asDictionary() != nullptr) {
    state_ = State::Readable;
    root_ = std::move(parsed.value);
    return;
  }
  state_ = State::Damaged;
  fault_ = parsed.error.empty() ? "its root is no dictionary" : std::move(parsed.error);
}

}  // namespace tbdaily
