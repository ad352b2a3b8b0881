// The drivers of a live host, over trees of /proc, /sys and /dev that are laid out for the test.
#include "platform/linux/live/live_host.h"

#include <gmock/gmock.h>

#include <map>

#include "platform/byte_reader.h"
#include "platform/linux/host_test_support.h"
#include "testing/allocations.h"

namespace tbdaily {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::Not;

struct Element {
  std::uint64_t stamp;
  std::vector<std::int64_t> words;
  friend bool operator==(const Element&, const Element&) = default;
};

struct LiveHostTest : ::testing::Test {
  LiveHost& open() {
    live = std::make_unique<LiveHost>(device.folder.path() / "live", recordings);
    names.clear();
    interests.clear();
    for (const PlistValue& entry : *live->entries().asArray()) {
      const PlistValue legend = entry.get("properties").get("KdReportLegend");
      if (legend.asArray() == nullptr) continue;
      for (const PlistValue& group : *legend.asArray()) addGroup(entry, group);
    }
    values = live->openValues();
    elements = values->configure(interests);
    buffer.clear();
    for (const std::size_t count : elements) buffer.emplace_back(count * HubRoom::kElementBytes);
    sample();
    return *live;
  }
  void addGroup(const PlistValue& entry, const PlistValue& group) {
    for (const PlistValue& channel : *group.get("KdReportChannels").asArray()) {
      const PlistArray& fields = *channel.asArray();
      const auto type = static_cast<std::uint64_t>(*fields[1].asInteger());
      std::string line(*entry.get("name").asString());
      line.append(" ").append(*group.get("KdReportGroupName").asString());
      if (const PlistValue subgroup = group.get("KdReportSubGroupName"); subgroup)
        line.append("/").append(*subgroup.asString());
      line.append(" ").append(*fields[2].asString());
      line += " " + std::to_string(type >> 32) + ((type & 0xFF) == 2 ? " states" : "") +
              ((type >> 16 & 0x100) != 0 ? " daily" : "");
      const PlistValue unit = group.get("KdReportChannelInfo").get("KdReportChannelUnit");
      units[std::string(*fields[2].asString())] = static_cast<std::uint64_t>(*unit.asInteger());
      names.push_back(line);
      byName[std::string(*fields[2].asString())] = interests.size();
      interests.push_back({static_cast<std::uint64_t>(*entry.get("id").asInteger()),
                           static_cast<std::uint64_t>(*fields[0].asInteger())});
    }
  }
  void sample() {
    values->update();
    for (std::size_t i = 0; i < buffer.size(); ++i)
      if (!buffer[i].empty()) values->write(i, HubRoom(buffer[i]));
  }
  std::vector<Element> of(const std::string& name) {
    std::vector<Element> found;
    const std::vector<std::byte>& bytes = buffer.at(byName.at(name));
    const auto at = [&](std::size_t word) { return *ByteReader(bytes).at<std::uint64_t>(word * 8); };
    for (std::size_t i = 0; i < bytes.size() / 64; ++i) {
      found.push_back({at(i * 8 + 3), {}});
      for (std::size_t w = 0; w < 3; ++w)
        found.back().words.push_back(static_cast<std::int64_t>(at(i * 8 + 4 + w)));
    }
    return found;
  }
  std::int64_t value(const std::string& name) { return of(name).at(0).words[0]; }
  void put(const std::string& place, std::string_view text) { device.putLive(place, text); }
  void putDisk(const std::string& name, std::string_view stat) {
    put("/sys/block/" + name + "/device/x", "");
    put("/sys/block/" + name + "/stat", stat);
  }

  testing::TestHost device{true};
  Recordings recordings{device.host, device.codec};
  std::unique_ptr<LiveHost> live;
  std::unique_ptr<HubValues> values;
  std::vector<std::string> names;
  std::map<std::string, std::uint64_t> units;
  std::map<std::string, std::size_t> byName;
  std::vector<ChannelKey> interests;
  std::vector<std::size_t> elements;
  std::vector<std::vector<std::byte>> buffer;
};

TEST_F(LiveHostTest, EveryRowOfTheTableBecomesChannels) {
  const std::string cpus = "/sys/devices/system/cpu/";
  for (const auto& [state, name] :
       {std::pair{"state0", "POLL"}, {"state1", "C1E long name"}, {"state2", "C1E long other"}}) {
    put(cpus + "cpu0/cpuidle/" + state + "/name", std::string(name) + "\n");
    put(cpus + "cpu0/cpuidle/" + state + "/usage", "5\n");
    put(cpus + "cpu0/cpuidle/" + state + "/time", "70\n");
  }
  put("/proc/stat", "cpu  9 9 9 9 9 9 9 9 0 0\ncpu0 1 2 3 4 5 6 7 8 0 0\nintr 5\n");
  put(cpus + "cpufreq/policy0/stats/time_in_state", "3400499 3\n800500 4\n");
  put("/proc/pressure/io", "some avg10=0.00 avg60=0.00 avg300=0.00 total=12\n");
  put("/proc/vmstat", "nr_free_pages 5\npswpin 2\npswpout x\npgmajfault 7\n");
  put("/proc/meminfo", "MemTotal: 9 kB\nMemAvailable:   3 kB\n");
  put("/sys/devices/system/edac/mc/mc0/ce_count", "4");
  put("/sys/devices/system/edac/mc/mc1/ce_count", "5");
  putDisk("sda", "1 0 2 0 3 0 4 0 0 6 0 7 0 0 0 8 0\n");
  put("/sys/block/loop0/stat", "1 0 2 0 3 0 4 0 0 6 0\n");
  for (const std::string file : {"rx_bytes", "tx_bytes", "rx_errors", "tx_errors"})
    put("/sys/class/net/eth0/statistics/" + file, "10");
  put("/sys/class/net/eth0/device/x", "");
  put("/sys/class/net/lo/statistics/rx_bytes", "1");
  put("/sys/class/thermal/thermal_zone3/type", "soc\n");
  put("/sys/class/thermal/thermal_zone3/temp", "-40000\n");
  put("/sys/class/hwmon/hwmon1/name", "chip");
  put("/sys/class/hwmon/hwmon1/temp1_input", "45000");
  put("/sys/class/hwmon/hwmon1/temp1_label", "Core");
  put("/sys/class/hwmon/hwmon1/temp2_input", "46000");
  put("/sys/class/hwmon/hwmon1/temp2_label", "Core");
  put("/sys/class/hwmon/hwmon1/fan1_input", "900");
  for (const auto& [zone, name] :
       {std::pair{"intel-rapl:0", "package-0"}, {"intel-rapl:0:0", "core"}, {"mmio:0", "package-0"}}) {
    put(std::string("/sys/class/powercap/") + zone + "/name", name);
    put(std::string("/sys/class/powercap/") + zone + "/energy_uj", "99");
  }
  open();
  EXPECT_THAT(
      names,
      ElementsAre("cpu idle/cpu0 cpu0.idle 3 states", "cpu time/cpu0 cpu0.time 8 states",
                  "cpu frequency/policy0 policy0.frequency 2 states",
                  "pressure pressure/io pressure.io.some 1 daily", "memory memory memory.swappedIn 1 daily",
                  "memory memory memory.available 1 daily", "memory memory memory.majorFaults 1 daily",
                  "memory ecc memory.corrected 1 daily", "disk totals disk.readBytes 1 daily",
                  "disk totals disk.writtenBytes 1 daily", "disk totals disk.reads 1 daily",
                  "disk totals disk.writes 1 daily", "disk disks/sda disk.sda.readBytes 1",
                  "disk disks/sda disk.sda.writtenBytes 1", "disk disks/sda disk.sda.reads 1",
                  "disk disks/sda disk.sda.writes 1", "disk disks/sda disk.sda.discards 1",
                  "disk disks/sda disk.sda.flushes 1", "disk disks/sda disk.sda.busyTime 1",
                  "network totals net.receivedBytes 1 daily", "network totals net.sentBytes 1 daily",
                  "network interfaces/eth0 net.eth0.receivedBytes 1",
                  "network interfaces/eth0 net.eth0.sentBytes 1", "network interfaces/eth0 net.eth0.errors 1",
                  "thermal zones thermal.soc.3.temperature 1", "sensors chip.1 sensors.chip.1.Core 1",
                  "sensors chip.1 sensors.chip.1.Core.temp2 1", "sensors chip.1 sensors.chip.1.fan1 1",
                  "power zones power.intel-rapl.package-0.energy 1",
                  "power zones power.package-0.core.energy 1", "power zones power.mmio.package-0.energy 1"));
  EXPECT_EQ(units["disk.sda.readBytes"], 0x0900820000000000U);
  EXPECT_EQ(units["sensors.chip.1.fan1"], 0U);
  // "POLL", "C1E long" and, of the same eight bytes, the second state's number.
  EXPECT_EQ(of("cpu0.idle").at(0), (Element{0, {0x504F4C4C, 5, 70}}));
  EXPECT_EQ(of("cpu0.idle").at(1).words[0], 0x433145206C6F6E67);
  EXPECT_EQ(of("cpu0.idle").at(2).words[0], 0x737461746532);
  EXPECT_EQ(of("cpu0.time").at(1).words, (std::vector<std::int64_t>{0x6E696365, 0, 20000}));
  EXPECT_EQ(of("policy0.frequency").at(1).words, (std::vector<std::int64_t>{0x3830314D487A, 0, 40000}));
  EXPECT_EQ(value("disk.readBytes"), 1024);
  EXPECT_EQ(value("memory.available"), 3072);
  EXPECT_EQ(value("memory.corrected"), 9);
  EXPECT_EQ(value("net.eth0.errors"), 20);
  EXPECT_EQ(value("thermal.soc.3.temperature"), -40000);
  // FNV-1a of "thermal\0zones\0\0thermal.soc.3.temperature\0", computed elsewhere.
  EXPECT_EQ(interests[byName["thermal.soc.3.temperature"]].channel, 0x521F529FE2E1BC30U);
}

TEST_F(LiveHostTest, WhatVanishesOrFailsKeepsItsLastValueAndStatesShowWhoMoved) {
  put("/proc/stat", "cpu0 1 2 3 4 5 6 7 8\ncpu1 1 2 3 4 5 6 7 8\n");
  putDisk("sda", "0 0 4 0 0 0 0 0 0 0 0");
  putDisk("sdb", "0 0 6 0 0 0 0 0 0 0 0");
  open();
  put("/proc/stat", "cpu1 1 2 3 4 5 6 7 9\n");  // before the first reading: nothing has moved yet
  sample();
  EXPECT_EQ(of("cpu1.time").at(7).stamp, 0U);
  EXPECT_EQ(of("cpu1.time").at(7).words[2], 90000);
  EXPECT_EQ(of("cpu0.time").at(7).words[2], 80000);
  put("/proc/stat", "cpu1 1 2 3 4 5 6 8 9\ncpu0 -1 2 3 99999999999999999999 5 6 7 8\n");
  std::filesystem::remove_all(device.host.livePath("/sys/block/sdb"));
  put("/sys/block/sdb/stat", "");
  putDisk("sda", "0 0 5 0 0 0 0 0 0 0 0");
  putDisk("sdc", "0 0 9 0 0 0 0 0 0 0 0");
  sample();
  EXPECT_EQ(of("cpu1.time").at(7).stamp, 0U);
  EXPECT_GT(of("cpu1.time").at(6).stamp, 0U);
  EXPECT_EQ(of("cpu0.time").at(0).words[2], 10000);
  EXPECT_EQ(of("cpu0.time").at(3).words[2], 40000);
  EXPECT_EQ(value("disk.readBytes"), 11 * 512);
  // A text that outgrew its room ends within a number.
  put("/proc/stat", "cpu0 1 2 3 4 5 6 7 5" + std::string(4067, '\n') + "cpu1 9999999 2 3 4 5 6 7 8\n");
  sample();
  EXPECT_EQ(of("cpu0.time").at(7).words[2], 50000);
  EXPECT_EQ(of("cpu1.time").at(0).words[2], 10000);
}

TEST_F(LiveHostTest, WhatIsNoNumberOfItsRangeIsLeftOutAndOddNamesAreShown) {
  putDisk("a b", "-1 0 9223372036854775808 0 x 0 9223372036854775807 0 0 +5 0");
  putDisk(std::string(200, 'n'), "1");
  putDisk("bad\xFF\n", "1");
  putDisk("bad\xFE\n", "1");
  put("/proc/pressure/cpu", "some total=-5\nfull total=\n");
  for (const auto& [zone, temperature] :
       {std::pair{"0", "5 6"}, {"1", "5\n6"}, {"2", ""}, {"3", "5.0"}, {"4", "0x5"}}) {
    put(std::string("/sys/class/thermal/thermal_zone") + zone + "/type", "soc");
    put(std::string("/sys/class/thermal/thermal_zone") + zone + "/temp", temperature);
  }
  put("/sys/class/hwmon/hwmon0/name", "\n");
  put("/sys/class/hwmon/hwmon0/in1_input", "5");
  open();
  EXPECT_THAT(names, ElementsAre("disk totals disk.writtenBytes 1 daily", "disk totals disk.reads 1 daily",
                                 "disk disks/a b disk.a b.writtenBytes 1",
                                 "disk disks/bad\uFFFD\uFFFD disk.bad\uFFFD\uFFFD.reads 1",
                                 "disk disks/bad\uFFFD\uFFFD disk.bad\uFFFD\uFFFD.reads.stat 1",
                                 "disk disks/" + std::string(200, 'n') + " disk." + std::string(200, 'n') +
                                     ".reads 1"));
  EXPECT_EQ(value("disk.writtenBytes"), std::numeric_limits<std::int64_t>::max());
}

TEST_F(LiveHostTest, ManyProcessorsComeByTheirNumberAndNeedNoMoreFilesThanThereAre) {
  std::string stat;
  for (int i = 0; i < 256; ++i) {
    stat += "cpu" + std::to_string(i) + " " + std::to_string(i) + " 0 0 0 0 0 0 0\n";
    const std::string state = "/sys/devices/system/cpu/cpu" + std::to_string(i) + "/cpuidle/state0/";
    put(state + "name", "C1");
    put(state + "usage", std::to_string(i));
    put(state + "time", "1");
  }
  put("/proc/stat", stat);
  {
    const testing::ResourceLimit fewFiles(RLIMIT_NOFILE, 64);
    open();
    put("/sys/devices/system/cpu/cpu255/cpuidle/state0/usage", "300");
    sample();
  }
  ASSERT_EQ(names.size(), 512U);
  EXPECT_THAT(names[2], HasSubstr("cpu2.idle"));
  EXPECT_THAT(names[10], HasSubstr("cpu10.idle"));
  const std::size_t before = testing::allocations();
  sample();
  EXPECT_EQ(testing::allocations(), before);
  EXPECT_EQ(of("cpu255.idle").at(0).words[1], 300);
  EXPECT_EQ(of("cpu255.time").at(0).words[2], 2550000);
}

TEST_F(LiveHostTest, ARecordingOfHealthPagesAnswersForAllControllers) {
  PlistData page(512);
  page[1] = std::byte{0x2C};  // 300 kelvin
  page[2] = std::byte{0x01};
  page[32] = std::byte{3};
  page[63] = std::byte{1};  // more than 64 bits
  page[96] = std::byte{2};
  PlistData cold(512);
  const auto data = [](PlistData bytes) { return PlistValue::data(std::move(bytes)); };
  device.record(recording::kNvme, "controllers",
                PlistValue::dictionary(
                    {{"nvme10", data(cold)}, {"nvme2", data(page)}, {"nvme3", data(PlistData(511))}}));
  put("/dev/nvme7", "");
  ::testing::internal::CaptureStderr();
  open();
  EXPECT_THAT(::testing::internal::GetCapturedStderr(), HasSubstr("nvme3"));
  ASSERT_EQ(names.size(), 15U + 14U);
  EXPECT_THAT(names[0], "nvme nvme2 nvme2.criticalWarning 1 daily");
  EXPECT_THAT(::testing::PrintToString(names), Not(HasSubstr("nvme10.temperature")));
  EXPECT_EQ(value("nvme2.temperature"), 27);
  EXPECT_EQ(value("nvme2.readBytes"), 3 * 512000);
  EXPECT_EQ(value("nvme2.writtenBytes"), std::numeric_limits<std::int64_t>::max());
  EXPECT_EQ(value("nvme2.busyTime"), 120);
}

TEST_F(LiveHostTest, TheHeadOfAMultipathDriveIsNotCountedAgain) {
  const auto subsystem = device.host.livePath("/sys/devices/virtual/nvme-subsystem/nvme-subsys0");
  std::filesystem::create_directories(subsystem);
  put("/sys/block/nvme0n1/stat", "0 0 7 0 0 0 0 0 0 0 0");
  std::filesystem::create_directory_symlink(subsystem, device.host.livePath("/sys/block/nvme0n1/device"));
  putDisk("nvme0c0n1", "0 0 7 0 0 0 0 0 0 0 0");
  open();
  EXPECT_EQ(value("disk.readBytes"), 7 * 512);
  EXPECT_EQ(value("disk.nvme0n1.readBytes"), 7 * 512);
}

TEST_F(LiveHostTest, AHostThatShowsNothingHasTheHubAlone) {
  EXPECT_EQ(open().entries().asArray()->size(), 1U);
  EXPECT_TRUE(names.empty());
}

}  // namespace
}  // namespace tbdaily
