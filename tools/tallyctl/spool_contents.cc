#include "tools/tallyctl/spool_contents.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <set>

#include "platform/linux/base/host_notes.h"
#include "platform/linux/base/passing_file.h"
#include "platform/linux/log_spool.h"

namespace tbdaily {

namespace {

constexpr std::string_view kMetaSuffix = ".meta.plist";

struct PartPlace {
  std::string_view name, folder;
  bool hasBatches;
};
constexpr std::array<PartPlace, 3> kParts{{{"pending", LogSpool::kPending, false},
                                           {"withheld", LogSpool::kWithheld, false},
                                           {"outbox", LogSpool::kOutbox, true}}};

std::string below(std::string_view folder) {
  return std::string(LogSpool::kFolder) + "/" + std::string(folder);
}

Failure unreadable(const DeviceFiles& files, const std::string& path, int error) {
  return Failure{files.place(path).native() + " cannot be read: " + errorText(error)};
}

std::optional<PlistDate> creationOf(const DeviceFolder& folder, PropertyListCodec& codec,
                                    const std::string& description) {
  FileDescriptor file;
  FileContents contents;
  if (folder.openForReading(description, file) != 0 || readOpenFile(file.get(), contents) != 0)
    return std::nullopt;
  const auto created = codec.parse(contents.bytes).value.get("created").asDate();
  return created && std::isfinite(created->secondsSinceReference) ? created : std::nullopt;
}

bool isFile(const struct stat& status) {
  return S_ISREG(status.st_mode);
}

std::optional<Failure> readFolder(const Host& host, PropertyListCodec& codec, const std::string& folder,
                                  std::vector<SpooledLog>& logs) {
  const DeviceFiles& files = host.files();
  DeviceFolder opened;
  std::vector<std::string> names;
  int error = files.openFolder(below(folder), opened);
  if (error == ENOENT) return std::nullopt;
  if (error == 0) error = opened.names(names);
  if (error != 0) return unreadable(files, below(folder), error);
  const std::set<std::string> all(names.begin(), names.end());
  for (const std::string& name : names) {
    struct stat status {
    }, description{};
    if (name.starts_with('.') || name.ends_with(kMetaSuffix) || opened.status(name, status) != 0 ||
        !isFile(status))
      continue;
    SpooledLog log{folder, name, static_cast<std::uint64_t>(status.st_size),
                   PlistDate::fromUnixSeconds(static_cast<double>(status.st_mtim.tv_sec))};
    const std::string meta = name + std::string(kMetaSuffix);
    if (all.contains(meta) && opened.status(meta, description) == 0) {
      log.bytes += static_cast<std::uint64_t>(description.st_size);
      log.created = creationOf(opened, codec, meta).value_or(log.created);
    }
    logs.push_back(std::move(log));
  }
  return std::nullopt;
}

std::optional<Failure> readBatches(const Host& host, PropertyListCodec& codec, const std::string& folder,
                                   std::vector<SpooledLog>& logs) {
  DeviceFolder opened;
  std::vector<std::string> names;
  int error = host.files().openFolder(below(folder), opened);
  if (error == ENOENT) return std::nullopt;
  if (error == 0) error = opened.names(names);
  if (error != 0) return unreadable(host.files(), below(folder), error);
  for (const std::string& name : names) {
    struct stat status {};
    if (opened.status(name, status) != 0 || !S_ISDIR(status.st_mode)) continue;
    if (auto failure = readFolder(host, codec, std::string(folder).append("/").append(name), logs))
      return failure;
  }
  return std::nullopt;
}

bool isOlder(const SpooledLog& left, const SpooledLog& right) {
  if (left.created.secondsSinceReference != right.created.secondsSinceReference)
    return left.created.secondsSinceReference < right.created.secondsSinceReference;
  return left.name < right.name;
}

}  // namespace

std::uint64_t SpoolPart::bytes() const {
  std::uint64_t sum = 0;
  for (const SpooledLog& log : logs) sum += log.bytes;
  return sum;
}

std::uint64_t SpoolContents::bytes() const {
  std::uint64_t sum = 0;
  for (const SpoolPart& part : parts) sum += part.bytes();
  return sum;
}

Outcome<SpoolContents> readSpool(const Host& host, PropertyListCodec& codec) {
  SpoolContents contents;
  for (std::size_t i = 0; i < kParts.size(); ++i) {
    SpoolPart& part = contents.parts[i];
    part.name = kParts[i].name;
    const std::string folder(kParts[i].folder);
    const auto failure = kParts[i].hasBatches ? readBatches(host, codec, folder, part.logs)
                                              : readFolder(host, codec, folder, part.logs);
    if (failure) return *failure;
    std::ranges::sort(part.logs, isOlder);
  }
  return contents;
}

void writeSpool(JsonWriter& json, const SpoolContents& contents) {
  for (const SpoolPart& part : contents.parts) {
    const auto entry = json.object(part.name);
    json.add("logs", part.logs.size());
    json.add("bytes", part.bytes());
    json.add("oldest", part.logs.empty() ? PlistValue() : PlistValue(part.logs.front().created));
  }
}

std::vector<SpooledLog> logsToPrune(const SpoolContents& contents, const PruneLimits& limits) {
  std::vector<SpooledLog> all;
  for (const SpoolPart& part : contents.parts) all.insert(all.end(), part.logs.begin(), part.logs.end());
  std::ranges::sort(all, isOlder);
  std::uint64_t left = contents.bytes();
  std::vector<SpooledLog> chosen;
  for (SpooledLog& log : all) {
    const bool isOld =
        limits.olderThan && log.created.secondsSinceReference < limits.olderThan->secondsSinceReference;
    if (!isOld && (!limits.maximum || left <= *limits.maximum)) continue;
    left -= log.bytes;
    chosen.push_back(std::move(log));
  }
  return chosen;
}

Outcome<std::size_t> removeLogs(const Host& host, const std::vector<SpooledLog>& logs) {
  const DeviceFiles& files = host.files();
  DeviceFolder spool;
  FileLock lock;
  int error = files.openFolder(LogSpool::kFolder, spool);
  if (error == ENOENT) return std::size_t{0};
  if (error == 0) error = lock.acquire(spool, LogSpool::kLockFile);
  if (error != 0)
    return Failure{files.place(LogSpool::kFolder).native() + " cannot be locked: " + errorText(error)};
  std::size_t removed = 0;
  for (const SpooledLog& log : logs) {
    DeviceFolder folder;
    error = files.openFolder(below(log.folder), folder);
    // The log first: a description alone is what a run takes for a remain.
    if (error == 0) error = folder.remove(log.name);
    if (error == 0) {
      ++removed;
      error = folder.remove(log.name + std::string(kMetaSuffix));
    }
    if (error != 0 && error != ENOENT)
      return Failure{files.place(below(log.folder) + "/" + log.name).native() +
                     " cannot be removed: " + errorText(error)};
    const auto slash = log.folder.find('/');
    if (slash == std::string::npos || !folder.isOpen()) continue;
    DeviceFolder batches;
    // A batch that holds anything stays.
    if (files.openFolder(below(log.folder.substr(0, slash)), batches) == 0)
      ::unlinkat(batches.descriptor(), log.folder.substr(slash + 1).c_str(), AT_REMOVEDIR);
  }
  return removed;
}

}  // namespace tbdaily
