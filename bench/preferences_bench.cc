// A preference that is set and synchronized, beside the same by hand: a file written anew and renamed, both
// it and its folder forced to storage. In the folder for temporary files (TMPDIR): where that is memory,
// storage costs nothing.

#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <filesystem>
#include <string>

#include "platform/linux/linux_preferences.h"
#include "platform/plist/codec.h"
#include "testing/temporary_folder.h"

namespace tbdaily {
namespace {

constexpr std::string_view kDomain = "com.example.counters", kKey = "Counter7";

struct Device {
  testing::TemporaryFolder folder;
  Host host{folder.path(), false};
  PlistCodec codec;
  LinuxPreferences preferences{host, codec};

  // A domain of forty counters.
  Device() {
    for (int i = 0; i < 40; ++i)
      preferences.setValue("Counter" + std::to_string(i), PlistValue::int64(i), kDomain);
  }
  std::filesystem::path place() const {
    return folder.path() / std::string(LinuxPreferences::kFolder).substr(1) /
           (std::string(kDomain) + ".plist");
  }
};

void setAndSynchronize(benchmark::State& state) {
  Device device;
  std::int64_t value = 1000;
  for (auto _ : state) {
    device.preferences.setValue(kKey, PlistValue::int64(++value), kDomain);
    device.preferences.synchronize(kDomain);
  }
  LinuxPreferences others(device.host, device.codec);
  if (!(others.getValue(kKey, kDomain) == PlistValue::int64(value)))
    state.SkipWithError("the value is not stored");
}
BENCHMARK(setAndSynchronize)->UseRealTime()->Unit(benchmark::kMicrosecond);

bool writeByHand(const std::filesystem::path& place, std::string_view bytes) {
  const std::filesystem::path passing = place.native() + ".new";
  const int file = ::open(passing.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
  const int folder = ::open(place.parent_path().c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  const bool isWritten = ::write(file, bytes.data(), bytes.size()) == static_cast<ssize_t>(bytes.size()) &&
                         ::fsync(file) == 0 && ::rename(passing.c_str(), place.c_str()) == 0 &&
                         ::fsync(folder) == 0;
  ::close(file);
  ::close(folder);
  return isWritten;
}

void writeRenameAndForce(benchmark::State& state) {
  const Device device;
  FileContents contents;
  readHostFile(device.place(), contents);
  const std::string bytes(contents.text());
  for (auto _ : state) {
    if (!writeByHand(device.place(), bytes)) state.SkipWithError("cannot be written");
  }
}
BENCHMARK(writeRenameAndForce)->UseRealTime()->Unit(benchmark::kMicrosecond);

}  // namespace
}  // namespace tbdaily
