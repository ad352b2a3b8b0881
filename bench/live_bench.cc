// The drivers of a live host: a sampling of all channels of machines with so many processors, over a tree of
// /proc and /sys that is laid out in a folder, beside reading the same files alone.

#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <unistd.h>

#include <filesystem>
#include <map>
#include <memory>
#include <vector>

#include "drivermetrics/kd_report.h"
#include "platform/linux/host_test_support.h"

namespace tbdaily {
namespace {

using namespace kdreport;

std::string numbered(std::string_view before, int number, std::string_view behind = {}) {
  return std::string(before).append(std::to_string(number)).append(behind);
}

// Idle states and frequencies of each processor, some disks, interfaces, sensors and zones of energy.
void layOut(testing::TestHost& device, int processors) {
  std::string times = "cpu  1 2 3 4 5 6 7 8 0 0\n";
  for (int i = 0; i < processors; ++i) {
    times += numbered("cpu", i, " 401230 102 203040 98765432 3456 0 7890 12 0 0\n");
    for (int state = 0; state < 4; ++state) {
      const std::string folder =
          numbered(numbered("/sys/devices/system/cpu/cpu", i, "/cpuidle/state"), state, "/");
      device.putLive(folder + "name", numbered("C", state, "\n"));
      device.putLive(folder + "usage", "123456\n");
      device.putLive(folder + "time", "9876543210\n");
    }
    device.putLive(numbered("/sys/devices/system/cpu/cpufreq/policy", i, "/stats/time_in_state"),
                   "3400000 12345\n2200000 23456\n800000 345678\n");
  }
  device.putLive("/proc/stat", times + "intr 1 2 3\n");
  for (const char* pressure : {"cpu", "memory", "io"})
    device.putLive(std::string("/proc/pressure/") + pressure,
                   "some avg10=0.00 avg60=0.00 avg300=0.00 total=123\nfull avg10=0.00 avg60=0.00 avg300=0.00 "
                   "total=45\n");
  device.putLive("/proc/vmstat", "pswpin 1\npswpout 2\npgmajfault 3\noom_kill 0\n");
  device.putLive("/proc/meminfo", "MemTotal: 8 kB\nMemAvailable: 4 kB\n");
  for (int i = 0; i < 4; ++i) {
    device.putLive(numbered("/sys/block/sda", i, "/device/model"), "x");
    device.putLive(numbered("/sys/block/sda", i, "/stat"), "1 2 3 4 5 6 7 8 9 10 11 12 13 14 15 16 17\n");
    for (const char* figure : {"rx_bytes", "tx_bytes", "rx_packets", "tx_packets", "rx_errors", "tx_errors",
                               "rx_dropped", "tx_dropped"})
      device.putLive(numbered("/sys/class/net/eth", i, "/statistics/") + figure, "12345\n");
    device.putLive(numbered("/sys/class/hwmon/hwmon", i, "/name"), "chip\n");
    for (int sensor = 1; sensor < 9; ++sensor)
      device.putLive(numbered(numbered("/sys/class/hwmon/hwmon", i, "/temp"), sensor, "_input"), "42000\n");
  }
}

// A machine that is laid out once, with a subscription to all of its channels.
struct Machine {
  explicit Machine(int processors) : device(true) {
    layOut(device, processors);
    platform = std::make_unique<LinuxPlatform>(device.host);
    DriverRegistry& registry = platform->services().driverRegistry;
    const KdReportCollection channels = KdReportCopyAllChannels(registry, kKdReportFileByDriver);
    if (channels)
      subscription = KdReportCreateSubscription(registry, nullptr, channels.get(), &subscribed, 0, nullptr);
  }

  testing::TestHost device;
  std::unique_ptr<LinuxPlatform> platform;
  KdReportCollection subscribed;
  std::shared_ptr<KdReportSubscription> subscription;
};

Machine& machineWith(std::int64_t processors) {
  static std::map<std::int64_t, std::unique_ptr<Machine>> machines;
  auto& machine = machines[processors];
  if (!machine) machine = std::make_unique<Machine>(static_cast<int>(processors));
  return *machine;
}

void sampling(benchmark::State& state) {
  const Machine& machine = machineWith(state.range(0));
  std::uint32_t channels = 0;
  for (auto _ : state) {
    const KdReportCollection samples =
        KdReportCreateSamples(machine.subscription.get(), machine.subscribed.get(), nullptr);
    channels = KdReportGetChannelCount(samples.get());
  }
  state.counters["channels"] = channels;
  // Of each processor its idle states, times and frequencies.
  if (channels < 3 * state.range(0)) state.SkipWithError("channels are missing");
}

void readingTheFiles(benchmark::State& state) {
  std::vector<int> files;
  for (const auto& entry : std::filesystem::recursive_directory_iterator(
           machineWith(state.range(0)).device.folder.path() / "live")) {
    // What is read once, when the host is looked through.
    if (entry.is_regular_file() && entry.path().filename() != "name" && entry.path().filename() != "model")
      files.push_back(::open(entry.path().c_str(), O_RDONLY | O_CLOEXEC));
  }
  std::vector<char> text(1 << 16);
  for (auto _ : state) {
    for (const int file : files) benchmark::DoNotOptimize(::pread(file, text.data(), text.size(), 0));
  }
  for (const int file : files) ::close(file);
  state.counters["files"] = static_cast<double>(files.size());
}

BENCHMARK(sampling)->Arg(8)->Arg(64)->Arg(256)->Unit(benchmark::kMicrosecond);
BENCHMARK(readingTheFiles)->Arg(8)->Arg(64)->Arg(256)->Unit(benchmark::kMicrosecond);

}  // namespace
}  // namespace tbdaily
