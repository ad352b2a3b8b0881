#include "platform/linux/replay/recordings.h"

#include <algorithm>

#include "platform/linux/base/host_notes.h"

namespace tbdaily {

std::filesystem::path Recordings::path(std::string_view file) const {
  return host_.devicePath(recording::kFolder) / file;
}

PlistValue Recordings::load(std::string_view file) {
  using State = CachedPlistFile::State;
  const std::lock_guard guard(mutex_);
  auto found = loaded_.find(file);
  if (found == loaded_.end()) found = loaded_.try_emplace(std::string(file)).first;
  CachedPlistFile& loaded = found->second;
  const std::filesystem::path place = path(file);
  loaded.refresh(place, codec_);
  if (loaded.state() == State::Damaged || loaded.state() == State::Unreadable)
    noteOnce("recording " + place.native() + " is ignored: " + loaded.fault());
  return loaded.root();
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
