#include "tools/tallyctl/store_copy.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <thread>
#include <vector>

#include "platform/linux/base/host_notes.h"
#include "platform/linux/store/sqlite_analytics_history.h"
#include "platform/linux/store/store_locator.h"

namespace tbdaily {

namespace {

constexpr int kAttempts = 50;
constexpr auto kPause = std::chrono::milliseconds(20);
constexpr std::size_t kChunk = std::size_t{1} << 20;

// A file of TMPDIR that has no name, or loses it at once where the file system knows no other way.
int makeUnnamed(FileDescriptor& file) {
  std::error_code error;
  const std::filesystem::path folder = std::filesystem::temp_directory_path(error);
  if (error) return error.value();
  file = FileDescriptor(::open(folder.c_str(), O_TMPFILE | O_RDWR | O_CLOEXEC, 0600));
  if (file.isOpen()) return 0;
  std::string name = (folder / "tallyctl-XXXXXX").native();
  file = FileDescriptor(::mkostemp(name.data(), O_CLOEXEC));
  if (!file.isOpen()) return errno;
  return ::unlink(name.c_str()) == 0 ? 0 : errno;
}

int copyBytes(const FileDescriptor& from, const FileDescriptor& to) {
  std::vector<std::byte> chunk(kChunk);
  if (::ftruncate(to.get(), 0) != 0 || ::lseek(to.get(), 0, SEEK_SET) != 0) return errno;
  while (true) {
    const ssize_t count = ::read(from.get(), chunk.data(), chunk.size());
    if (count < 0 && errno == EINTR) continue;
    if (count <= 0) return count == 0 ? 0 : errno;
    if (const int error = writeAll(to.get(), std::span(chunk).first(static_cast<std::size_t>(count)));
        error != 0)
      return error;
  }
}

// The state of both files, to tell whether somebody wrote while they were copied.
using StoreState = std::array<FileIdentity, 2>;

StoreState stateOf(const DeviceFolder& folder, const std::string& name) {
  StoreState state;
  struct stat status {};
  if (folder.status(name, status) == 0) state[0] = FileIdentity::of(status);
  if (folder.status(storeLogOf(name), status) == 0) state[1] = FileIdentity::of(status);
  return state;
}

// A file that is missing gives an empty copy.
int copyIfThere(const DeviceFolder& folder, const std::string& name, const FileDescriptor& to) {
  FileDescriptor from;
  const int error = folder.openForReading(name, from);
  if (error == ENOENT) return ::ftruncate(to.get(), 0) == 0 ? 0 : errno;
  return error == 0 ? copyBytes(from, to) : error;
}

}  // namespace

Outcome<StoreCopy> copyStore(const StorePlace& store) {
  const std::string shown = store.file().native();
  StoreCopy copy;
  DeviceFolder folder;
  int error = store.files->openFolder(store.folder, folder);
  if (error == ENOENT) return copy;
  if (error != 0) return Failure{shown + " cannot be read: " + errorText(error)};
  if (!folder.has(store.name)) return copy;
  error = makeUnnamed(copy.file);
  if (error == 0) error = makeUnnamed(copy.log);
  if (error != 0) return Failure{"no file for a copy of the store can be made: " + errorText(error)};
  for (int attempt = 0; attempt < kAttempts; ++attempt) {
    const StoreState before = stateOf(folder, store.name);
    error = copyIfThere(folder, store.name, copy.file);
    if (error == 0) error = copyIfThere(folder, storeLogOf(store.name), copy.log);
    if (stateOf(folder, store.name) == before) {
      if (error != 0) return Failure{shown + " cannot be copied: " + errorText(error)};
      return copy;
    }
    std::this_thread::sleep_for(kPause);
  }
  return Failure{shown + " is being written all the time; try again later"};
}

Outcome<std::unique_ptr<OpenAnalyticsHistory>> openHistoryCopy(LinuxPlatform& platform) {
  const AnalyticsStoreLocator locate =
      analyticsStoreLocator(platform.host(), platform.services().analyticsHome);
  OpenedStore opened;
  if (const auto place = locate()) {
    auto copy = copyStore(*place);
    if (!copy) return Failure{copy.reason()};
    if (copy->file.isOpen()) opened = openStoreCopy(std::move(copy->file), std::move(copy->log), *place);
    if (!opened.result.ok()) return Failure{opened.result.error};
  }
  return SqliteAnalyticsHistory(locate, [&opened](const StorePlace&) { return std::move(opened); }).open();
}

}  // namespace tbdaily
