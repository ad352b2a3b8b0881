// The drivers of a live host over files whose contents are the input, before and after they change: what they
// show is never the number that means "invalid", and no channel is there twice.
#include <filesystem>
#include <fstream>
#include <set>

#include "fuzz/input.h"
#include "platform/linux/live/live_recording.h"
#include "platform/plist/codec.h"
#include "testing/temporary_folder.h"

using namespace tbdaily;
using fuzz::Input;
using fuzz::require;

namespace {

namespace fs = std::filesystem;

constexpr std::array<std::string_view, 26> kFiles = {
    "proc/stat",
    "proc/vmstat",
    "proc/meminfo",
    "proc/pressure/cpu",
    "proc/pressure/io",
    "sys/devices/system/cpu/cpu0/cpuidle/state0/name",
    "sys/devices/system/cpu/cpu0/cpuidle/state0/usage",
    "sys/devices/system/cpu/cpu0/cpuidle/state0/time",
    "sys/devices/system/cpu/cpu0/cpuidle/state10/name",
    "sys/devices/system/cpu/cpu0/cpuidle/state10/usage",
    "sys/devices/system/cpu/cpu0/cpuidle/state10/time",
    "sys/devices/system/cpu/cpufreq/policy0/stats/time_in_state",
    "sys/devices/system/edac/mc/mc0/ce_count",
    "sys/block/sda/device/x",
    "sys/block/sda/stat",
    "sys/class/net/eth0/device/x",
    "sys/class/net/eth0/statistics/rx_bytes",
    "sys/class/net/eth0/statistics/rx_errors",
    "sys/class/net/eth0/statistics/tx_errors",
    "sys/class/thermal/thermal_zone0/type",
    "sys/class/thermal/thermal_zone0/temp",
    "sys/class/hwmon/hwmon0/name",
    "sys/class/hwmon/hwmon0/temp1_input",
    "sys/class/hwmon/hwmon0/temp1_label",
    "sys/class/powercap/intel-rapl:0/name",
    "sys/class/powercap/intel-rapl:0/energy_uj"};

// Writes some of the files, and takes some away.
void change(const fs::path& root, Input& input) {
  for (std::size_t changes = input.below(40); changes > 0; --changes) {
    const fs::path file = root / kFiles[input.below(kFiles.size())];
    const bool isRemoved = input.below(8) == 0;
    const auto contents = input.section();
    std::error_code ignored;
    fs::remove(file, ignored);
    if (isRemoved) continue;
    fs::create_directories(file.parent_path(), ignored);
    std::ofstream(file, std::ios::binary)
        .write(reinterpret_cast<const char*>(contents.data()), static_cast<std::streamsize>(contents.size()));
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const testing::TemporaryFolder folder;
  const fs::path root = folder.path() / "live";
  fs::remove_all(root);
  Input input(data, size);
  change(root, input);
  const Host host(folder.path() / "device", false);
  PlistCodec codec;
  Recordings recordings(host, codec);
  const LiveHost live(root, recordings);
  change(root, input);
  const LiveRecording recorded = recordLiveHost(live);
  std::set<std::pair<std::int64_t, std::int64_t>> channels;
  const PlistValue list = recorded.hub.get("channels");
  for (const PlistValue& channel : *list.asArray()) {
    const std::pair key(*channel.get("driver").asInteger(), *channel.get("channel").asInteger());
    require(channels.insert(key).second, "a channel is there once");
    const PlistValue elements = channel.get("elements");
    for (const PlistValue& element : *elements.asArray()) {
      const PlistValue words = element.get("words");
      for (const PlistValue& word : *words.asArray())
        require(*word.asInteger() != std::numeric_limits<std::int64_t>::min(),
                "no value is the invalid number");
    }
  }
  return 0;
}
