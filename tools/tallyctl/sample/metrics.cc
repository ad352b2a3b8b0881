#include "tools/tallyctl/sample/metrics.h"

#include <algorithm>
#include <cstdint>
#include <iterator>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "drivermetrics/kd_report.h"
#include "platform/byte_writer.h"
#include "tools/tallyctl/metrics/hub_legends.h"

namespace tbdaily {

using namespace kdreport;

namespace {

// What is printable in an identifier is the name of a channel or state that has no other.
constexpr std::int64_t idOf(std::string_view text) {
  std::uint64_t id = 0;
  for (const char c : text) id = id << 8 | static_cast<unsigned char>(c);
  return static_cast<std::int64_t>(id);
}

constexpr std::int64_t kHubID = 0x1'0000'0A00;

struct SampleDriver {
  std::int64_t id;
  std::string_view name;
};
constexpr SampleDriver kDrivers[] = {
    {0x1'0000'0A01, "DisplayPipe"},   {0x1'0000'0A02, "BatteryGauge"},     {0x1'0000'0A03, "CpuComplex"},
    {0x1'0000'0A04, "WirelessRadio"}, {0x1'0000'0A05, "MemoryController"},
};
enum DriverIndex : std::size_t { kDisplay, kBattery, kCpu, kRadio, kMemory };

namespace unit {
constexpr std::int64_t kNone = kKdReportInvalid;
constexpr std::int64_t kCount = 0;
constexpr std::int64_t kTicks24M = 0x0100'0079'8000'0018;
constexpr std::int64_t kNanoseconds = 0x0100'0076'0000'0000;
constexpr std::int64_t kMicroseconds = 0x0100'0079'0000'0000;
constexpr std::int64_t kMilliseconds = 0x0100'007C'0000'0000;
constexpr std::int64_t kVolts = 0x0500'0000'0000'0000;
constexpr std::int64_t kMillivolts = 0x0500'007C'0000'0000;
constexpr std::int64_t kHertz = 0x0800'0000'0000'0000;
constexpr std::int64_t kBytes = 0x0900'8200'0000'0000;
constexpr std::int64_t kPages4KiB = 0x0900'8C00'0000'0004;
constexpr std::int64_t kCelsius = 0x0A00'0000'0000'0000;
constexpr std::int64_t kEvents = 0x6400'0000'0000'0000;
constexpr std::int64_t kPackets = 0x6500'0000'0000'0000;
}  // namespace unit

// A histogram's buckets: segments one after the other, each linear or a power of its base.
struct Segment {
  std::uint32_t base;
  std::uint32_t isExponential;
  std::uint32_t buckets;
};
constexpr Segment kEvenSegments[] = {{5, 0, 8}};               // up to 40
constexpr Segment kWideSegments[] = {{2, 1, 6}, {100, 0, 4}};  // 2 to 64, then 100 to 400
enum class Buckets : std::uint8_t { None, Even, Wide };

struct SampleGroup {
  DriverIndex driver;
  std::string_view group, subGroup;  // empty: none
  std::int64_t unit;
  Buckets buckets = Buckets::None;
};
constexpr SampleGroup kGroups[] = {
    {kDisplay, "Panel", "Power", unit::kTicks24M},
    {kDisplay, "Panel", "Frames", unit::kEvents},
    {kDisplay, "Panel", "Timing", unit::kMilliseconds, Buckets::Even},
    {kDisplay, "", "", unit::kHertz},
    {kBattery, "Battery", "Cells", unit::kMillivolts},
    {kBattery, "Battery", "", unit::kCelsius},
    {kBattery, "Battery", "", unit::kCount},
    {kBattery, "Charger", "", unit::kVolts},
    {kBattery, "Charger", "", unit::kNone},
    {kCpu, "CPU", "Cluster 0", unit::kTicks24M},
    {kCpu, "CPU", "Cluster 1", unit::kTicks24M},
    {kCpu, "CPU", "", unit::kNanoseconds},
    {kCpu, "CPU", "", unit::kEvents},
    {kRadio, "Radio", "Traffic", unit::kPackets},
    {kRadio, "Radio", "Traffic", unit::kBytes},
    {kRadio, "Radio", "Power", unit::kNanoseconds},
    {kRadio, "Radio", "Latency", unit::kMicroseconds, Buckets::Wide},
    {kMemory, "DRAM", "", unit::kPages4KiB},
    {kMemory, "DRAM", "Bandwidth", unit::kBytes, Buckets::Wide},
    {kMemory, "", "", unit::kNone},
};
enum GroupIndex : std::size_t {
  kPanelPower,
  kPanelFrames,
  kPanelTiming,
  kPanelRate,
  kCells,
  kBatteryHeat,
  kBatteryLife,
  kChargerInput,
  kChargerState,
  kCluster0,
  kCluster1,
  kCoreTime,
  kCpuEvents,
  kPacketTraffic,
  kByteTraffic,
  kRadioPower,
  kRadioLatency,
  kPages,
  kBandwidth,
  kMemoryOther,
};

struct SampleChannel {
  GroupIndex group;
  std::int64_t id;
  std::string_view name;  // empty: none
  KdReportFormat format;
  std::uint16_t categories;
  std::int64_t value;            // of a simple channel, the first of an array, the hits of the fullest bucket
  std::size_t count = 1;         // values of an array, states without names
  std::string_view states = {};  // names with a space between, the one with most time first
};
constexpr SampleChannel kChannels[] = {
    {kPanelPower, 0x10, "Panel Power", kKdReportState, 0x101, 0, 0, "ON OFF DIM"},
    {kPanelFrames, 0x11, "Frames Shown", kKdReportSimple, 0x102, 9'412'006},
    {kPanelFrames, 0x12, "Frames Dropped", kKdReportSimple, 0x002, 1'877},
    {kPanelTiming, 0x13, "Frame Time", kKdReportHistogram, 0x002, 4'800'000},
    {kPanelRate, 0x14, "Refresh Rate", kKdReportSimple, 0x100, 120},
    {kCells, 0x20, "Cell Voltage", kKdReportArray, 0x004, 4'180, 2},
    {kBatteryHeat, idOf("TEMP"), "", kKdReportSimple, 0x104, 31},
    {kBatteryLife, 0x21, "Charge Cycles", kKdReportSimple, 0x104, 412},
    {kChargerInput, idOf("VBUS"), "", kKdReportSimple, 0x004, 5},
    {kChargerState, 0x22, "Charger", kKdReportState, 0x004, 0, 0, "IDLE FULL FAST SLOW"},
    {kCluster0, 0x30, "Performance", kKdReportState, 0x008, 0, 5},
    {kCluster1, 0x31, "Performance", kKdReportState, 0x008, 0, 0, "P0 P1 P2 P3 P4 P5"},
    {kCoreTime, 0x32, "Core Active Time", kKdReportArray, 0x108, 61'400'118'250'733, 6},
    {kCpuEvents, 0x33, "Context Switches", kKdReportSimple, 0x108, 1'288'400'312},
    {kCpuEvents, 0x34, "Interrupts", kKdReportSimple, 0x008, 402'611'870},
    {kPacketTraffic, idOf("TXPK"), "", kKdReportSimple, 0x110, 3'811'402},
    {kPacketTraffic, idOf("RXPK"), "", kKdReportSimple, 0x110, 7'205'118},
    {kByteTraffic, 0x40, "Bytes Sent", kKdReportSimple, 0x110, 1'904'327'884},
    {kByteTraffic, 0x41, "Bytes Received", kKdReportSimple, 0x110, 8'640'229'156},
    {kRadioPower, 0x42, "Radio Power", kKdReportState, 0x011, 0, 0, "IDLE OFF RX TX"},
    {kRadioLatency, 0x43, "Round Trip", kKdReportHistogram, 0x110, 220'000},
    {kPages, 0x50, "Pages Compressed", kKdReportSimple, 0x120, 12'880'411},
    {kPages, 0x51, "Pages by Zone", kKdReportArray, 0x020, 1'048'576, 4},
    {kBandwidth, 0x52, "Burst Size", kKdReportHistogram, 0x020, 90'400'000},
    {kMemoryOther, 0x1FF, "", kKdReportSimple, 0x8000, 77'203},
};

constexpr std::uint64_t kUptime = 259'200;  // seconds: three days
constexpr std::uint64_t kStampsPerSecond = 24'000'000;
constexpr std::uint64_t kNow = kUptime * kStampsPerSecond;

PlistValue number(std::uint64_t n) {
  return PlistValue::int64(static_cast<std::int64_t>(n));
}

PlistValue text(std::string_view t) {
  return PlistValue::string(std::string(t));
}

std::span<const Segment> segmentsOf(Buckets buckets) {
  if (buckets == Buckets::None) return {};
  return buckets == Buckets::Even ? std::span<const Segment>(kEvenSegments) : kWideSegments;
}

// None when the group has neither unit nor buckets.
PlistValue channelInfo(const SampleGroup& group) {
  PlistDictionary info;
  if (group.unit != unit::kNone) info.set(kd_report_key::kChannelUnit, PlistValue::int64(group.unit));
  PlistData config;
  for (const Segment& segment : segmentsOf(group.buckets)) {
    for (const std::uint32_t field : {segment.base, segment.isExponential, 0U, segment.buckets})
      appendLittleEndian(config, field);
  }
  if (!config.empty()) info.set(kd_report_key::kChannelConfig, PlistValue::data(std::move(config)));
  return info.empty() ? PlistValue() : PlistValue::dictionary(std::move(info));
}

std::vector<std::int64_t> stateIDs(const SampleChannel& channel) {
  std::vector<std::int64_t> ids;
  for (std::string_view rest = channel.states; !rest.empty();) {
    const std::string_view name = rest.substr(0, rest.find(' '));
    ids.push_back(idOf(name));
    rest.remove_prefix(std::min(rest.size(), name.size() + 1));
  }
  for (std::size_t i = 0; channel.states.empty() && i < channel.count; ++i)
    ids.push_back(static_cast<std::int64_t>(i));
  return ids;
}

PlistValue element(std::uint64_t stamp, PlistArray words) {
  return PlistValue::dictionary({{"stamp", number(stamp)}, {"words", PlistValue::array(std::move(words))}});
}

// The states share the time since the start, the first one is the current one.
PlistArray stateElements(const SampleChannel& channel, const ChannelMeaning& meaning) {
  const std::vector<std::int64_t> ids = stateIDs(channel);
  const std::uint64_t states = ids.size();
  const std::uint64_t total = meaning.unitsIn(kUptime).value_or(kUptime);
  const std::uint64_t share = total / (states * (states + 1) / 2);
  std::uint64_t rest = total;
  PlistArray elements(states);
  for (std::uint64_t i = states; i-- > 0;) {
    const std::uint64_t residency = i == 0 ? rest : share * (states - i);
    rest -= residency;
    elements[i] = element(kNow - i * kStampsPerSecond / 3,
                          {PlistValue::int64(ids[i]), number(9'000 / (i + 2) + i), number(residency)});
  }
  return elements;
}

PlistArray histogramElements(const SampleChannel& channel, const ChannelMeaning& meaning) {
  constexpr std::size_t kMostBuckets = 64;
  PlistArray elements;
  std::uint64_t lower = 0;
  const std::vector<std::int64_t> bounds = meaning.bucketBounds(kMostBuckets);
  for (std::size_t i = 0; i < bounds.size(); ++i) {
    // Fullest at the third bucket; the rare large values never came up.
    constexpr std::size_t kFullest = 2;
    const std::size_t distance = i > kFullest ? i - kFullest : kFullest - i;
    const auto hits = i + 1 < bounds.size() ? static_cast<std::uint64_t>(channel.value) >> 2 * distance : 0;
    const auto upper = static_cast<std::uint64_t>(bounds[i]);
    const std::uint64_t minimum = lower + (upper - lower) / 4, maximum = lower + (upper - lower) * 3 / 4;
    const std::uint64_t sum = minimum + maximum + (hits - 2) * ((minimum + maximum) / 2);
    elements.push_back(hits == 0
                           ? element(0, {})
                           : element(kNow, {number(hits), number(minimum), number(maximum), number(sum)}));
    lower = upper;
  }
  return elements;
}

PlistArray arrayElements(const SampleChannel& channel) {
  PlistArray elements, words;
  for (std::size_t i = 0; i < channel.count; ++i) {
    words.push_back(PlistValue::int64(channel.value - static_cast<std::int64_t>(i) * (channel.value / 50)));
    if (words.size() < kElementWords && i + 1 < channel.count) continue;
    elements.push_back(element(kNow, std::move(words)));
    words.clear();
  }
  return elements;
}

PlistArray elementsOf(const SampleChannel& channel) {
  const ChannelMeaning meaning(channelInfo(kGroups[channel.group]));
  if (channel.format == kKdReportState) return stateElements(channel, meaning);
  if (channel.format == kKdReportHistogram) return histogramElements(channel, meaning);
  if (channel.format == kKdReportArray) return arrayElements(channel);
  return {element(kNow, {PlistValue::int64(channel.value)})};
}

PlistValue typeOf(const SampleChannel& channel, std::size_t elements) {
  return number(std::uint64_t{elements} << 32 | std::uint64_t{channel.categories} << 16 | channel.format);
}

PlistValue legendGroup(std::size_t index) {
  const SampleGroup& group = kGroups[index];
  PlistDictionary legend;
  if (!group.group.empty()) legend.set(kd_report_key::kGroupName, text(group.group));
  if (!group.subGroup.empty()) legend.set(kd_report_key::kSubGroupName, text(group.subGroup));
  legend.set(kd_report_key::kChannelInfo, channelInfo(group));
  PlistArray channels;
  for (const SampleChannel& channel : kChannels) {
    if (channel.group != index) continue;
    PlistArray entry{PlistValue::int64(channel.id), typeOf(channel, elementsOf(channel).size())};
    if (!channel.name.empty()) entry.push_back(text(channel.name));
    channels.push_back(PlistValue::array(std::move(entry)));
  }
  legend.set(kd_report_key::kChannels, PlistValue::array(std::move(channels)));
  return PlistValue::dictionary(std::move(legend));
}

PlistValue driverEntry(std::size_t index) {
  PlistArray legend;
  for (std::size_t group = 0; group < std::size(kGroups); ++group) {
    if (kGroups[group].driver == index) legend.push_back(legendGroup(group));
  }
  const SampleDriver& driver = kDrivers[index];
  return PlistValue::dictionary(
      {{"id", PlistValue::int64(driver.id)},
       {"name", text(driver.name)},
       {"class", text(std::string(driver.name) + "Driver")},
       {"properties", PlistValue::dictionary(
                          {{std::string(kd_report_key::kLegendPublic), PlistValue::boolean(true)},
                           {std::string(kd_report_key::kLegend), PlistValue::array(std::move(legend))}})}});
}

}  // namespace

PlistArray sampleMetricsEntries() {
  PlistArray entries{PlistValue::dictionary({{"id", PlistValue::int64(kHubID)},
                                             {"name", text("KdReportHub")},
                                             {"class", text("KdReportHub")},
                                             {"properties", PlistValue::dictionary({})},
                                             {"client", PlistValue::dictionary({{"kind", text("hub")}})}})};
  for (std::size_t driver = 0; driver < std::size(kDrivers); ++driver) entries.push_back(driverEntry(driver));
  return entries;
}

PlistDictionary sampleHub() {
  PlistArray channels;
  for (const SampleChannel& channel : kChannels) {
    PlistArray elements = elementsOf(channel);
    channels.push_back(
        PlistValue::dictionary({{"driver", PlistValue::int64(kDrivers[kGroups[channel.group].driver].id)},
                                {"channel", PlistValue::int64(channel.id)},
                                {"type", typeOf(channel, elements.size())},
                                {"elements", PlistValue::array(std::move(elements))}}));
  }
  return {{"channels", PlistValue::array(std::move(channels))}};
}

}  // namespace tbdaily
