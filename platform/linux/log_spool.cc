#include "platform/linux/log_spool.h"

#include <sys/file.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>
#include <set>
#include <vector>

#include "platform/calendar.h"
#include "platform/linux/base/host_notes.h"
#include "platform/linux/base/passing_file.h"
#include "platform/linux/host_identity.h"
#include "platform/plist/json.h"

namespace tbdaily {

namespace {

constexpr std::string_view kMetaSuffix = ".meta.plist";
constexpr unsigned kMaximumNumber = 100000;  // of logs with one name and second
constexpr int kCarewellGenerations = 5;
constexpr const char* kCarewell = "Carewell";
constexpr double kLockPatience = 5.0;  // seconds

std::string dayText(PlistDate now) {
  return dateText(now, DateFraction::Drop).substr(0, 10);
}

class FileOutput : public LogOutput {
 public:
  explicit FileOutput(int fd) : fd_(fd) {}
  bool write(std::span<const std::byte> bytes) override {
    if (error_ == 0) error_ = writeAll(fd_, bytes);
    return error_ == 0;
  }
  int error() const { return error_; }

 private:
  int fd_;
  int error_ = 0;
};

// What a job that died in the middle may have left: passing names, and meta files whose log never came.
// Callers hold the lock.
// Answers the names that are left.
std::vector<std::string> removeRemains(const DeviceFolder& folder) {
  std::vector<std::string> names = removePassingFiles(folder);
  const std::set<std::string> all(names.begin(), names.end());
  std::erase_if(names, [&](const std::string& name) {
    return name.ends_with(kMetaSuffix) && !all.contains(name.substr(0, name.size() - kMetaSuffix.size())) &&
           folder.remove(name) == 0;
  });
  return names;
}

// Puts both files in place under the first free number. The log comes last: who sees it finds its meta file.
int placePair(const DeviceFolder& folder, const std::string& stem, std::string_view type, TemporaryFile& meta,
              TemporaryFile& log) {
  for (unsigned n = 0; n < kMaximumNumber; ++n) {
    const std::string name = stem + "-" + std::to_string(n) + "." + std::string(type);
    const std::string metaName = name + std::string(kMetaSuffix);
    if (folder.has(name) || folder.has(metaName)) continue;
    if (const int error = meta.placeNew(metaName); error != 0) return error;
    int error = log.placeNew(name);
    if (error == 0) {
      error = folder.sync();
      if (error != 0) folder.remove(name);
    }
    if (error != 0) folder.remove(metaName);
    return error;
  }
  return EEXIST;
}

// The first free one of "STEM.jsonl", "STEM-1.jsonl" ...
std::string freeName(const DeviceFolder& folder, const std::string& stem) {
  std::string name = stem + ".jsonl";
  for (unsigned n = 1; folder.has(name) && n < kMaximumNumber; ++n)
    name = stem + "-" + std::to_string(n) + ".jsonl";
  return name;
}

// The old contents are forced to storage before their name moves: the run that wrote them may not have come
// to it.
int moveDurably(const DeviceFolder& from, const std::string& name, const DeviceFolder& to,
                const std::string& newName) {
  FileDescriptor file;
  if (const int error = from.openForReading(name, file); error != 0) return error;
  if (::fsync(file.get()) != 0) return errno;
  return from.rename(name, to, newName);
}

}  // namespace

std::string spoolStamp(PlistDate now) {
  const CivilTime time = civilTime(now);
  std::array<char, 16> clock;
  std::snprintf(clock.data(), clock.size(), "-%02u%02u%02u", time.hour, time.minute, time.second);
  return dayText(now) + clock.data();
}

void LogSpool::noteFailure(std::string_view folder, int error) const {
  noteWriteFailure(host_.files().place(kFolder) / folder, error);
}

int LogSpool::lockSpool(DeviceFolder& folder, FileLock& lock) const {
  const int error = host_.files().makeFolder(kFolder, folder);
  return error == 0 ? lock.acquire(folder, kLockFile) : error;
}

bool LogSpool::writeLog(Consent consent, std::string_view type, std::string_view name,
                        const PlistValue& options, PlistDate now, const LogWriter& writer) {
  if (!isSafeName(type) || !isSafeName(name)) return false;
  PlistDictionary description{{"type", PlistValue::string(std::string(type))},
                              {"name", PlistValue::string(std::string(name))},
                              {"created", PlistValue(now)},
                              {"id", PlistValue::string(randomUuid())}};
  description.set("options", options);
  const PlistWriteResult meta =
      codec_.write(PlistValue::dictionary(std::move(description)), PlistForm::Plain);
  if (!meta.ok) {
    noteOnce("the log " + std::string(name) + " cannot be described: " + meta.error);
    return false;
  }

  const std::string waiting(consent == Consent::Yes ? kPending : kWithheld);
  DeviceFolder spool, folder;
  FileLock lock;
  TemporaryFile logFile, metaFile;
  int error = lockSpool(spool, lock);
  if (error == 0) error = spool.makeFolder(waiting, folder);
  if (error == 0) removeRemains(folder);
  if (error == 0) error = metaFile.create(folder);
  if (error == 0) error = writeAll(metaFile.fd(), meta.bytes);
  if (error == 0) error = logFile.create(folder);
  if (error != 0) {
    noteFailure(waiting, error);
    return false;
  }
  FileOutput output(logFile.fd());
  const bool whole = writer(output);
  error = output.error();
  if (error == 0 && !whole) return false;
  if (error == 0)
    error = placePair(folder, std::string(name) + "-" + spoolStamp(now), type, metaFile, logFile);
  if (error != 0) noteFailure(waiting, error);
  return error == 0;
}

int LogSpool::openStructured(int type, const std::string& day) {
  DeviceFolder spool, structured, folder;
  StructuredFile& open = structured_[type];
  open.day = day;
  int error = host_.files().makeFolder(kFolder, spool);
  if (error == 0) error = spool.makeFolder(std::string(kStructured), structured);
  if (error == 0) error = structured.makeFolder(std::to_string(type), folder);
  if (error == 0) error = folder.openForAppending(day + ".jsonl", open.file);
  if (error == 0 && !lockFile_.isOpen()) error = spool.openForLocking(kLockFile, lockFile_);
  if (error != 0) structured_.erase(type);
  return error;
}

// All of the line or none of it: half a line would spoil the next one too.
int LogSpool::appendLine(int type, const std::string& day, std::string_view line) {
  for (int attempt = 0; attempt < 2; ++attempt) {
    const auto open = structured_.find(type);
    if (open == structured_.end() || open->second.day != day) {
      if (const int error = openStructured(type, day); error != 0) return error;
    }
    const int file = structured_.at(type).file.get();
    if (const int error = waitForLock(lockFile_.get(), kLockPatience); error != 0) return error;
    struct stat before {};
    int error = ::fstat(file, &before) == 0 ? 0 : errno;
    // One that was moved on meanwhile, or has got a second name, is left alone.
    const bool isInPlace = error == 0 && before.st_nlink == 1;
    if (isInPlace) error = writeAll(file, line);
    if (isInPlace && error != 0 && ::ftruncate(file, before.st_size) != 0) error = errno;
    ::flock(lockFile_.get(), LOCK_UN);
    if (isInPlace || error != 0) return error;
    structured_.erase(type);
  }
  return kSecondName;
}

void LogSpool::appendStructured(int type, const PlistDictionary& data, PlistDate now) {
  const std::string day = dayText(now);
  const std::string line =
      "{\"time\": \"" + stampText(now, 3) + "\", \"data\": " + jsonText(PlistValue::dictionary(data)) + "}\n";
  const std::lock_guard guard(mutex_);
  if (const int error = appendLine(type, day, line); error != 0)
    noteFailure(std::string(kStructured) + "/" + std::to_string(type) + "/" + day + ".jsonl", error);
}

int LogSpool::moveOldStructured(const DeviceFolder& from, const std::string& type, std::string_view today,
                                const DeviceFolder& to) {
  std::vector<std::string> names;
  if (const int error = from.names(names); error != 0) return error;
  for (const std::string& name : names) {
    constexpr std::string_view kSuffix = ".jsonl";
    if (name.size() != today.size() + kSuffix.size() || !name.ends_with(kSuffix)) continue;
    const std::string day = name.substr(0, today.size());
    if (day >= today) continue;
    const std::string stem = std::string("structured-").append(type).append("-").append(day);
    if (const int error = moveDurably(from, name, to, freeName(to, stem)); error != 0)
      noteWriteFailure(from.place(name), error);
  }
  return 0;
}

void LogSpool::dumpOldStructured(Consent consent, PlistDate now) {
  DeviceFolder spool, structured, waiting;
  int error = host_.files().openFolder(std::string(kFolder).append("/").append(kStructured), structured);
  if (error == ENOENT || error == kUnusableRoot) return;
  FileLock lock;
  if (error == 0) error = lockSpool(spool, lock);
  std::vector<std::string> types;
  if (error == 0) error = structured.names(types);
  if (error == 0 && types.empty()) return;
  if (error == 0)
    error = spool.makeFolder(std::string(consent == Consent::Yes ? kPending : kWithheld), waiting);
  if (error != 0) return noteFailure(kStructured, error);
  for (const std::string& type : types) {
    DeviceFolder folder;
    error = structured.openFolder(type, folder);
    if (error == ENOTDIR) continue;
    if (error == 0) error = moveOldStructured(folder, type, dayText(now), waiting);
    if (error != 0) noteWriteFailure(structured.place(type), error);
  }
}

void LogSpool::submitPending(PlistDate now) {
  DeviceFolder spool, pending, outbox;
  int error = host_.files().openFolder(std::string(kFolder).append("/").append(kPending), pending);
  if (error == ENOENT || error == kUnusableRoot) return;
  FileLock lock;
  if (error == 0) error = lockSpool(spool, lock);
  if (error == 0 && removeRemains(pending).empty()) return;
  if (error == 0) error = spool.makeFolder(std::string(kOutbox), outbox);
  if (error != 0) return noteFailure(kPending, error);

  // The folder itself moves, so that a submission is never half handed over.
  std::string place;
  for (unsigned n = 0; n < kMaximumNumber; ++n) {
    place = spoolStamp(now) + "-" + std::to_string(n);
    if (!outbox.has(place)) break;
  }
  error = spool.rename(std::string(kPending), outbox, place);
  if (error == 0) error = spool.makeFolder(std::string(kPending), pending);
  if (error == 0) error = outbox.sync();
  if (error == 0) error = spool.sync();
  if (error != 0) noteFailure(kOutbox, error);
}

void LogSpool::rollCarewell() {
  DeviceFolder spool, carewell;
  int error = host_.files().openFolder(std::string(kFolder).append("/").append(kCarewell), carewell);
  if (error == ENOENT || error == kUnusableRoot) return;
  FileLock lock;
  if (error == 0) error = lockSpool(spool, lock);
  std::vector<std::string> names;
  if (error == 0) error = carewell.names(names);
  if (error != 0) return noteFailure(kCarewell, error);
  for (const std::string& name : names) {
    if (!name.ends_with(".log")) continue;
    for (int generation = kCarewellGenerations; generation >= 1; --generation) {
      const std::string older = name + "." + std::to_string(generation);
      const std::string newer = generation == 1 ? name : name + "." + std::to_string(generation - 1);
      error = carewell.rename(newer, carewell, older);
      if (error == 0 || error == ENOENT) continue;
      noteWriteFailure(carewell.place(older), error);
      break;  // going on would replace the generation that could not move
    }
  }
}

}  // namespace tbdaily
