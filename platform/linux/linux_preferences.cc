#include "platform/linux/linux_preferences.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

namespace tbdaily {

namespace fs = std::filesystem;

fs::path LinuxPreferences::folder() const {
  return host_.devicePath("/var/mobile/Library/Preferences");
}

fs::path LinuxPreferences::file(std::string_view domain) const {
  return folder() / (std::string(domain) + ".plist");
}

bool LinuxPreferences::acceptsDomain(std::string_view domain) {
  if (isSafeName(domain)) return true;
  constexpr std::size_t kShown = 40;
  Host::noteOnce("preference domain \"" + std::string(domain.substr(0, kShown)) +
                 "\" is refused: a domain is 1 to 200 letters, " +
                 "digits, '.', '-' or '_' and does not begin with '.'");
  return false;
}

void LinuxPreferences::read(const fs::path& place, Domain& domain) {
  domain.values = PlistValue::dictionary({});
  FileContents contents;
  if (const int error = readRegularFile(place, contents); error != 0) {
    domain.identity = FileIdentity{};  // tried again at the next look
    domain.state = error == ENOENT ? FileState::Missing : FileState::Unreadable;
    if (error != ENOENT)
      Host::noteOnce("cannot read preferences " + place.native() + ": " + errorText(error));
    return;
  }
  domain.identity = contents.identity;
  const PlistParseResult parsed = codec_.parse(contents.bytes);
  if (parsed.value.asDictionary() != nullptr) {
    domain.state = FileState::Readable;
    domain.values = parsed.value;
    return;
  }
  domain.state = FileState::Damaged;
  Host::noteOnce("preferences " + place.native() + " are damaged and read as empty: " +
                 (parsed.error.empty() ? "the root is no dictionary" : parsed.error));
}

LinuxPreferences::Domain& LinuxPreferences::current(std::string_view name) {
  auto found = domains_.find(name);
  if (found == domains_.end()) found = domains_.emplace(std::string(name), Domain{}).first;
  Domain& domain = found->second;
  const fs::path place = file(name);
  const auto identity = fileIdentity(place);
  if (!identity) {
    domain = Domain{};
  } else if (identity != domain.identity) {
    read(place, domain);
  }
  return domain;
}

PlistValue LinuxPreferences::getValue(std::string_view key, std::string_view domain) {
  if (!acceptsDomain(domain)) return {};
  return current(domain).values.asDictionary()->get(key);
}

bool LinuxPreferences::moveAside(const fs::path& place) {
  for (unsigned n = 0; n < 10000; ++n) {
    const fs::path aside = place.native() + ".damaged-" + std::to_string(n);
    // A link never replaces, so that an earlier damaged file stays too.
    if (::link(place.c_str(), aside.c_str()) == 0) {
      ::unlink(place.c_str());
      Host::noteOnce("damaged preferences were moved aside as " + aside.native());
      return true;
    }
    if (errno != EEXIST) {
      Host::noteWriteFailure(aside, errno);
      return false;
    }
  }
  Host::noteOnce("too many damaged copies beside " + place.native() + "; remove some of them");
  return false;
}

bool LinuxPreferences::store(std::string_view name, Domain& domain, const PlistDictionary& values) {
  const fs::path place = file(name);
  PlistValue root = PlistValue::dictionary(values);
  const PlistWriteResult written = codec_.write(root, PlistForm::Exact);
  if (!written.ok) {
    Host::noteOnce("a preference of " + std::string(name) + " cannot be written: " + written.error);
    return false;
  }
  if (domain.state == FileState::Damaged && !moveAside(place)) return false;
  if (const int error = replaceFile(place, written.bytes); error != 0) {
    Host::noteWriteFailure(place, error);
    return false;
  }
  domain = Domain{FileIdentity{}, FileState::Readable, std::move(root)};  // just written, so read once more
  return true;
}

void LinuxPreferences::setValue(std::string_view key, const PlistValue& value, std::string_view name) {
  if (!acceptsDomain(name)) return;
  const fs::path lockFile = file(name).native() + ".lock";
  if (value.isNone() && !fileIdentity(file(name))) return;  // nothing to remove, nothing to make
  if (const int error = host_.makeFolders(folder()); error != 0)
    return Host::noteWriteFailure(folder(), error);
  FileLock lock;
  if (const int error = lock.acquire(lockFile); error != 0) return Host::noteWriteFailure(lockFile, error);

  Domain& domain = current(name);
  if (domain.state == FileState::Unreadable)
    return;  // named when it was read; replacing it would lose what it holds
  PlistDictionary values = *domain.values.asDictionary();
  if (value.isNone() && !values.contains(key) && domain.state != FileState::Damaged) return;
  values.set(key, value);
  store(name, domain, values);
}

void LinuxPreferences::synchronize(std::string_view name) {
  if (!acceptsDomain(name)) return;
  const fs::path place = file(name);
  const FileDescriptor fd(::open(place.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  if (!fd.isOpen()) {
    if (errno != ENOENT) Host::noteWriteFailure(place, errno);
    return;
  }
  if (::fsync(fd.get()) != 0) Host::noteWriteFailure(place, errno);
  if (const int error = syncFolder(folder()); error != 0) Host::noteWriteFailure(folder(), error);
}

}  // namespace tbdaily
