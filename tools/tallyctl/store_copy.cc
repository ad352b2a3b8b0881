#include "tools/tallyctl/store_copy.h"

#include <array>
#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <optional>
#include <thread>

#include "platform/linux/base/file_io.h"
#include "platform/linux/base/host_notes.h"
#include "platform/linux/store/store_file.h"

namespace tbdaily {

namespace fs = std::filesystem;

namespace {

constexpr int kAttempts = 50;
constexpr auto kPause = std::chrono::milliseconds(20);

// The state of both files, to tell whether somebody wrote while they were copied.
using StoreState = std::array<std::optional<FileIdentity>, 2>;

StoreState stateOf(const fs::path& store) {
  return {fileIdentity(store), fileIdentity(storeLogOf(store))};
}

std::error_code copyIfThere(const fs::path& from, const fs::path& to) {
  std::error_code error;
  fs::remove(to, error);
  if (!fs::exists(from, error)) return {};
  fs::copy_file(from, to, error);
  return error;
}

}  // namespace

StoreCopy::StoreCopy(const fs::path& store) {
  std::error_code ignored;
  std::string name = (fs::temp_directory_path(ignored) / "tallyctl-XXXXXX").native();
  if (::mkdtemp(name.data()) == nullptr) {
    error_ = "no folder for a copy of the store can be made: " + errorText(errno);
    return;
  }
  folder_ = name;
  path_ = folder_ / store.filename();
  for (int attempt = 0; attempt < kAttempts; ++attempt) {
    const StoreState before = stateOf(store);
    std::error_code error = copyIfThere(store, path_);
    if (!error) error = copyIfThere(storeLogOf(store), storeLogOf(path_));
    if (stateOf(store) == before) {
      if (error) error_ = store.native() + " cannot be copied: " + error.message();
      return;
    }
    std::this_thread::sleep_for(kPause);
  }
  error_ = store.native() + " is being written all the time; try again later";
}

StoreCopy::~StoreCopy() {
  std::error_code ignored;
  if (!folder_.empty()) fs::remove_all(folder_, ignored);
}

}  // namespace tbdaily
