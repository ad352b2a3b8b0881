#include "platform/linux/replay/recordings.h"

#include "platform/linux/base/host_notes.h"

namespace tbdaily {

std::string Recordings::path(std::string_view file) {
  return std::string(recording::kFolder).append("/").append(file);
}

namespace {
using State = CachedPlistFile::State;
}

const CachedPlistFile& Recordings::loaded(std::string_view file) {
  auto found = loaded_.find(file);
  if (found == loaded_.end()) found = loaded_.try_emplace(std::string(file)).first;
  CachedPlistFile& recording = found->second;
  recording.refresh(host_.files(), path(file), codec_);
  const auto line = [&] {
    return "recording " + host_.files().place(path(file)).native() + " is ignored: " + recording.fault();
  };
  if (recording.state() == State::Damaged) noteOnce(line());  // which counts as a missing one
  if (recording.state() == State::Unreadable) host_.files().noteUnread(line());
  return recording;
}

PlistValue Recordings::load(std::string_view file) {
  if (!host_.replays()) return PlistValue::dictionary({});
  const std::lock_guard guard(mutex_);
  return loaded(file).root();
}

bool Recordings::readFile(std::string_view file, FileContents& contents) {
  // What a recording names comes from outside: it leads nowhere else, by its name or through a link.
  const int error = host_.files().readFileBelow(recording::kFolder, file, contents);
  if (error != 0)
    host_.files().noteUnread("recorded file " + host_.files().place(path(file)).native() +
                             " is ignored: " + errorText(error));
  return error == 0;
}

bool Recordings::has(std::string_view file) const {
  if (!host_.replays()) return false;
  struct stat ignored {};
  return host_.files().status(path(file), ignored) == 0;
}

PlistValue Recordings::entry(std::string_view file, std::string_view key) {
  return load(file).get(key);
}

std::optional<PlistValue> Recordings::readableEntry(std::string_view file, std::string_view key) {
  if (!host_.replays()) return PlistValue();
  const std::lock_guard guard(mutex_);
  const CachedPlistFile& recording = loaded(file);
  if (recording.state() == State::Unreadable) return std::nullopt;
  return recording.root().get(key);
}

}  // namespace tbdaily
