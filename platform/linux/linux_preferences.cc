#include "platform/linux/linux_preferences.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <new>
#include <vector>

#include "platform/linux/base/host_notes.h"
#include "platform/linux/base/passing_file.h"

namespace tbdaily {

namespace fs = std::filesystem;
using State = CachedPlistFile::State;

std::string LinuxPreferences::path(std::string_view domain) {
  return std::string(kFolder).append("/").append(domain).append(".plist");
}

bool LinuxPreferences::acceptsDomain(std::string_view domain) {
  if (isSafeName(domain)) return true;
  constexpr std::size_t kShown = 40;
  noteOnce("preference domain \"" + std::string(domain.substr(0, kShown)) +
           "\" is refused: a domain is 1 to 200 letters, " +
           "digits, '.', '-' or '_' and does not begin with '.'");
  return false;
}

CachedPlistFile& LinuxPreferences::current(std::string_view name) {
  auto found = domains_.find(name);
  if (found == domains_.end()) found = domains_.try_emplace(std::string(name)).first;
  CachedPlistFile& domain = found->second;
  domain.refresh(host_.files(), path(name), codec_);
  if (domain.ranOutOfMemory()) throw std::bad_alloc();  // no absent answer: what it holds is not known yet
  const fs::path place = host_.files().place(path(name));
  if (domain.state() == State::Unreadable)
    host_.files().noteUnread("cannot read preferences " + place.native() + ": " + domain.fault());
  if (domain.state() == State::Damaged)
    host_.files().noteUnread("preferences " + place.native() +
                             " are damaged and read as empty: " + domain.fault());
  return domain;
}

PlistValue LinuxPreferences::getValue(std::string_view key, std::string_view domain) {
  if (!acceptsDomain(domain)) return {};
  const std::lock_guard guard(mutex_);
  return current(domain).root().get(key);
}

bool LinuxPreferences::moveAside(const DeviceFolder& folder, const std::string& file) {
  for (unsigned n = 0; n < 10000; ++n) {
    const std::string aside = file + ".damaged-" + std::to_string(n);
    if (folder.has(aside)) continue;
    if (const int error = folder.rename(file, folder, aside); error != 0) {
      noteWriteFailure(folder.place(aside), error);
      return false;
    }
    noteOnce("damaged preferences were moved aside as " + folder.place(aside).native());
    return true;
  }
  noteOnce("too many damaged copies beside " + folder.place(file).native() + "; remove some of them");
  return false;
}

bool LinuxPreferences::isWritable(const Change& change, std::string_view name) {
  PlistDictionary alone;
  alone.set(change.key, change.value);
  const PlistWriteResult written = codec_.write(PlistValue::dictionary(std::move(alone)), PlistForm::Carried);
  if (!written.ok) noteOnce("a preference of " + std::string(name) + " cannot be written: " + written.error);
  return written.ok;
}

PlistDictionary LinuxPreferences::changed(PlistDictionary values, std::span<const Change> changes) {
  // The last change of a key decides; all removals at once, since each costs a pass over the domain.
  std::map<std::string_view, const PlistValue*> last;
  for (const Change& change : changes) last[change.key] = &change.value;
  values.removeIf([&last](std::string_view key) {
    const auto found = last.find(key);
    return found != last.end() && found->second->isNone();
  });
  for (const Change& change : changes) {
    if (!last[change.key]->isNone()) values.set(change.key, *last[change.key]);
  }
  return values;
}

std::string LinuxPreferences::bytesOf(std::string_view name, const PlistDictionary& stored,
                                      std::span<const Change> changes) {
  const PlistValue whole = PlistValue::dictionary(changed(stored, changes));
  PlistWriteResult result = codec_.write(whole, PlistForm::Exact);
  if (result.ok) return std::move(result.bytes);
  result = codec_.write(whole, PlistForm::Carried);
  if (result.ok) {
    noteOnce("preferences " + host_.files().place(path(name)).native() +
             ": characters that a property list cannot carry are stored as U+FFFD");
    return std::move(result.bytes);
  }
  // One value that no file can hold must not cost the others their place.
  std::vector<Change> writable;
  for (const Change& change : changes) {
    if (isWritable(change, name)) writable.push_back(change);
  }
  return codec_.write(PlistValue::dictionary(changed(stored, writable)), PlistForm::Carried).bytes;
}

bool LinuxPreferences::changeDomain(std::string_view name, std::span<const Change> changes) {
  if (!acceptsDomain(name)) return true;
  const bool onlyRemoves =
      std::all_of(changes.begin(), changes.end(), [](const Change& c) { return c.value.isNone(); });
  if (onlyRemoves && current(name).state() == State::Missing) return true;  // nothing to remove or to make
  const auto fail = [](const fs::path& place, int error) {
    noteWriteFailure(place, error);
    return false;
  };
  DeviceFolder folder;
  if (const int error = host_.files().makeFolder(kFolder, folder); error != 0)
    return fail(host_.files().place(kFolder), error);
  const std::string file = std::string(name) + ".plist";
  FileLock lock;
  if (const int error = lock.acquire(folder, file + ".lock"); error != 0)
    return fail(folder.place(file + ".lock"), error);

  CachedPlistFile& domain = current(name);
  if (domain.state() == State::Unreadable)
    return false;  // named when it was read; replacing it would lose what it holds
  const PlistDictionary& stored = *domain.root().asDictionary();
  const bool changesNothing =
      onlyRemoves && std::none_of(changes.begin(), changes.end(),
                                  [&stored](const Change& c) { return stored.contains(c.key); });
  if (changesNothing && domain.state() != State::Damaged) return true;
  if (domain.state() == State::Damaged && !moveAside(folder, file)) return false;
  const std::string bytes = bytesOf(name, stored, changes);
  domain.forget();  // whatever becomes of the write
  if (bytes.empty()) return false;
  if (const int error = folder.replaceFile(file, bytes); error != 0) return fail(folder.place(file), error);
  struct stat status {};
  if (folder.status(file, status) == 0) stored_.insert_or_assign(std::string(name), FileIdentity::of(status));
  return true;
}

void LinuxPreferences::setValue(std::string_view key, const PlistValue& value, std::string_view name) {
  const std::lock_guard guard(mutex_);
  const Change change{key, value};
  changeDomain(name, std::span(&change, 1));
}

std::vector<std::string> LinuxPreferences::applyChanges(std::span<const PreferenceChange> changes) {
  const std::lock_guard guard(mutex_);
  std::map<std::string_view, std::vector<Change>> byDomain;
  std::vector<std::string_view> inOrder;
  for (const PreferenceChange& change : changes) {
    std::vector<Change>& series = byDomain[change.domain];
    if (series.empty()) inOrder.push_back(change.domain);
    series.push_back({change.key, change.value});
  }
  std::vector<std::string> unwritten;
  for (const std::string_view domain : inOrder) {
    if (!changeDomain(domain, byDomain[domain])) unwritten.emplace_back(domain);
  }
  return unwritten;
}

bool LinuxPreferences::isStored(std::string_view name, const FileIdentity& file) {
  const std::lock_guard guard(mutex_);
  const auto found = stored_.find(name);
  return found != stored_.end() && found->second == file;
}

void LinuxPreferences::synchronize(std::string_view name) {
  if (!acceptsDomain(name)) return;
  DeviceFolder folder;
  const std::string fileName = std::string(name) + ".plist";
  int error = host_.files().openFolder(kFolder, folder);
  struct stat status {};
  if (error == 0) error = folder.status(fileName, status);
  if (error == 0 && !isStored(name, FileIdentity::of(status))) {
    FileDescriptor file;
    error = folder.openForReading(fileName, file);
    if (error == 0 && ::fsync(file.get()) != 0) error = errno;
  }
  if (error == ENOENT) return;
  if (error == 0) error = folder.sync();
  if (error != 0) noteWriteFailure(host_.files().place(path(name)), error);
}

}  // namespace tbdaily
