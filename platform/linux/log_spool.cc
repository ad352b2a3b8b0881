#include "platform/linux/log_spool.h"

#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>
#include <vector>

#include "platform/calendar.h"
#include "platform/linux/base/file_io.h"
#include "platform/linux/base/host_notes.h"
#include "platform/plist/json.h"

namespace tbdaily {

namespace fs = std::filesystem;

namespace {

constexpr std::string_view kMetaSuffix = ".meta.plist";
constexpr unsigned kMaximumNumber = 100000;  // of logs with one name and second
constexpr int kCarewellGenerations = 5;

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

// All of the text or none of it: half a line would spoil the next one too. Callers hold the lock.
int appendWhole(const fs::path& place, std::string_view text) {
  const FileDescriptor fd(
      ::open(place.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC | O_NONBLOCK, 0600));
  struct stat before {};
  if (!fd.isOpen() || ::fstat(fd.get(), &before) != 0) return errno;
  const int error = writeAll(fd.get(), text);
  return error != 0 && ::ftruncate(fd.get(), before.st_size) != 0 ? errno : error;
}

// Folders are made when one turns out to be missing, not looked for each time.
bool isMissingFolder(int error) {
  return error == ENOENT || error == ENOTDIR;
}

std::vector<fs::path> filesIn(const fs::path& folder) {
  std::vector<fs::path> files;
  std::error_code error;
  for (fs::directory_iterator it(folder, error); !error && it != fs::directory_iterator();
       it.increment(error)) {
    files.push_back(it->path());
  }
  return files;
}

// What a job that died in the middle may have left: passing names, and meta files whose log never came.
// Callers hold the lock.
void removeRemains(const fs::path& folder) {
  for (const fs::path& file : filesIn(folder)) {
    const std::string name = file.filename().native();
    std::error_code ignored;
    if (name.starts_with(TemporaryFile::kNamePrefix)) fs::remove(file, ignored);
    if (!name.ends_with(kMetaSuffix)) continue;
    const fs::path log = folder / name.substr(0, name.size() - kMetaSuffix.size());
    if (!fs::exists(fs::symlink_status(log, ignored))) fs::remove(file, ignored);
  }
}

// Puts both files in place under the first free number. The log comes last: who sees it finds its meta file.
int placePair(const fs::path& stem, std::string_view type, TemporaryFile& meta, TemporaryFile& log) {
  for (unsigned n = 0; n < kMaximumNumber; ++n) {
    const fs::path place = stem.native() + "-" + std::to_string(n) + "." + std::string(type);
    const fs::path metaPlace = place.native() + std::string(kMetaSuffix);
    std::error_code ignored;
    if (fs::exists(fs::symlink_status(place, ignored)) || fs::exists(fs::symlink_status(metaPlace, ignored)))
      continue;
    if (const int error = meta.placeNew(metaPlace); error != 0) return error;
    int error = log.placeNew(place);
    if (error == 0) {
      error = syncFolder(stem.parent_path());
      if (error != 0) ::unlink(place.c_str());
    }
    if (error != 0) ::unlink(metaPlace.c_str());
    return error;
  }
  return EEXIST;
}

}  // namespace

std::string spoolStamp(PlistDate now) {
  const CivilTime time = civilTime(now);
  std::array<char, 16> clock;
  std::snprintf(clock.data(), clock.size(), "-%02u%02u%02u", time.hour, time.minute, time.second);
  return dayText(now) + clock.data();
}

int LogSpool::lockSpool(FileLock& lock) const {
  const fs::path place = folder() / ".lock";
  const int error = lock.acquire(place);
  if (!isMissingFolder(error)) return error;
  const int folderError = host_.makeFolders(folder());
  return folderError == 0 ? lock.acquire(place) : folderError;
}

bool LogSpool::writePending(std::string_view type, std::string_view name, const PlistValue& options,
                            PlistDate now, const LogWriter& writer) {
  if (!isSafeName(type) || !isSafeName(name)) return false;
  PlistDictionary description{{"type", PlistValue::string(std::string(type))},
                              {"name", PlistValue::string(std::string(name))},
                              {"created", PlistValue(now)}};
  description.set("options", options);
  const PlistWriteResult meta =
      codec_.write(PlistValue::dictionary(std::move(description)), PlistForm::Plain);
  if (!meta.ok) {
    noteOnce("the log " + std::string(name) + " cannot be described: " + meta.error);
    return false;
  }

  FileLock lock;
  TemporaryFile logFile, metaFile;
  int error = lockSpool(lock);
  if (error == 0) error = host_.makeFolders(pending());
  if (error == 0) removeRemains(pending());
  if (error == 0) error = metaFile.create(pending());
  if (error == 0) error = writeAll(metaFile.fd(), meta.bytes);
  if (error == 0) error = logFile.create(pending());
  if (error != 0) {
    noteWriteFailure(pending(), error);
    return false;
  }
  FileOutput output(logFile.fd());
  const bool whole = writer(output);
  error = output.error();
  if (error == 0 && !whole) return false;
  if (error == 0)
    error = placePair(pending() / (std::string(name) + "-" + spoolStamp(now)), type, metaFile, logFile);
  if (error != 0) noteWriteFailure(pending(), error);
  return error == 0;
}

void LogSpool::appendStructured(int type, const PlistDictionary& data, PlistDate now) {
  const fs::path place = folder() / "Structured" / std::to_string(type) / (dayText(now) + ".jsonl");
  const std::string line =
      "{\"time\": \"" + stampText(now, 3) + "\", \"data\": " + jsonText(PlistValue::dictionary(data)) + "}\n";
  FileLock lock;
  int error = lockSpool(lock);
  if (error == 0) error = appendWhole(place, line);
  if (isMissingFolder(error)) {
    error = host_.makeFolders(place.parent_path());
    if (error == 0) error = appendWhole(place, line);
  }
  if (error != 0) noteWriteFailure(place, error);
}

void LogSpool::dumpOldStructured(PlistDate now) {
  const fs::path structured = folder() / "Structured";
  std::error_code ignored;
  if (!fs::is_directory(structured, ignored)) return;
  FileLock lock;
  if (const int error = lockSpool(lock); error != 0) return noteWriteFailure(structured, error);
  const std::string today = dayText(now);
  for (const fs::path& typeFolder : filesIn(structured)) {
    for (const fs::path& file : filesIn(typeFolder)) {
      const std::string day = file.stem().native();
      if (file.extension() != ".jsonl" || day.size() != today.size() || day >= today) continue;
      if (const int error = host_.makeFolders(pending()); error != 0)
        return noteWriteFailure(pending(), error);
      const std::string stem = "structured-" + typeFolder.filename().native() + "-" + day;
      fs::path place = pending() / (stem + ".jsonl");
      for (unsigned n = 1; fs::exists(fs::symlink_status(place, ignored)) && n < kMaximumNumber; ++n) {
        place = pending() / (stem + "-" + std::to_string(n) + ".jsonl");
      }
      if (::rename(file.c_str(), place.c_str()) != 0) noteWriteFailure(place, errno);
    }
  }
}

void LogSpool::submitPending(PlistDate now) {
  std::error_code ignored;
  if (!fs::is_directory(pending(), ignored)) return;
  FileLock lock;
  if (const int error = lockSpool(lock); error != 0) return noteWriteFailure(pending(), error);
  removeRemains(pending());
  if (fs::is_empty(pending(), ignored)) return;
  if (const int error = host_.makeFolders(outbox()); error != 0) return noteWriteFailure(outbox(), error);

  // The folder itself moves, so that a submission is never half handed over.
  fs::path place;
  for (unsigned n = 0; n < kMaximumNumber; ++n) {
    place = outbox() / (spoolStamp(now) + "-" + std::to_string(n));
    if (!fs::exists(fs::symlink_status(place, ignored))) break;
  }
  if (::rename(pending().c_str(), place.c_str()) != 0) return noteWriteFailure(place, errno);
  if (const int error = host_.makeFolders(pending()); error != 0) noteWriteFailure(pending(), error);
  syncFolder(outbox());
}

void LogSpool::rollCarewell() {
  const fs::path carewell = folder() / "Carewell";
  std::error_code ignored;
  if (!fs::is_directory(carewell, ignored)) return;
  FileLock lock;
  if (const int error = lockSpool(lock); error != 0) return noteWriteFailure(carewell, error);
  for (const fs::path& file : filesIn(carewell)) {
    if (file.extension() != ".log") continue;
    for (int generation = kCarewellGenerations; generation >= 1; --generation) {
      const fs::path older = file.native() + "." + std::to_string(generation);
      const fs::path newer =
          generation == 1 ? file : fs::path(file.native() + "." + std::to_string(generation - 1));
      if (::rename(newer.c_str(), older.c_str()) == 0 || errno == ENOENT) continue;
      noteWriteFailure(older, errno);
      break;  // going on would replace the generation that could not move
    }
  }
}

}  // namespace tbdaily
