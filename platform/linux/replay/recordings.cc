#include "platform/linux/replay/recordings.h"

#include <algorithm>
#include <cerrno>

#include "platform/linux/host_notes.h"

namespace tbdaily {

std::filesystem::path Recordings::path(std::string_view file) const {
  return host_.devicePath("/System/Device") / file;
}

PlistValue Recordings::load(std::string_view file) {
  const std::lock_guard guard(mutex_);
  auto found = loaded_.find(file);
  if (found == loaded_.end()) found = loaded_.emplace(std::string(file), Loaded{}).first;
  Loaded& loaded = found->second;

  const std::filesystem::path place = path(file);
  const auto identity = fileIdentity(place);
  if (identity == loaded.identity) return loaded.root;
  loaded = Loaded{};
  if (!identity) return loaded.root;

  loaded.identity = FileIdentity{};  // what could not be read is tried again
  FileContents contents;
  if (const int error = readRegularFile(place, contents); error != 0) {
    if (error != ENOENT) noteOnce("recording " + place.native() + " is ignored: " + errorText(error));
    return loaded.root;
  }
  loaded.identity = contents.identity;
  const PlistParseResult parsed = codec_.parse(contents.bytes);
  if (parsed.value.asDictionary() != nullptr) {
    loaded.root = parsed.value;
  } else {
    const std::string reason = parsed.error.empty() ? "its root is no dictionary" : parsed.error;
    noteOnce("recording " + place.native() + " is ignored: " + reason);
  }
  return loaded.root;
}

bool Recordings::readFile(std::string_view file, FileContents& contents) {
  const std::filesystem::path folder = path("").parent_path();
  const std::filesystem::path place = (folder / file).lexically_normal();
  // What a recording names comes from outside: it leads nowhere else.
  if (std::mismatch(folder.begin(), folder.end(), place.begin(), place.end()).first != folder.end()) {
    noteOnce("recorded file " + place.native() + " is ignored: it lies outside of " + folder.native());
    return false;
  }
  const int error = readRegularFile(place, contents);
  if (error != 0) noteOnce("recorded file " + place.native() + " is ignored: " + errorText(error));
  return error == 0;
}

PlistValue Recordings::entry(std::string_view file, std::string_view key) {
  return load(file).get(key);
}

}  // namespace tbdaily
