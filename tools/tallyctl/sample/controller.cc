#include "tools/tallyctl/sample/controller.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <initializer_list>

#include "platform/byte_writer.h"
#include "storage/exporters.h"
#include "storage/stats_table.h"
#include "storage/vendor_counters.h"

namespace tbdaily {

namespace {

// Little-endian bytes of a controller's buffer.
class BufferBuilder {
 public:
  BufferBuilder& u16(std::uint64_t value) { return put(value, 2); }
  BufferBuilder& u32(std::uint64_t value) { return put(value, 4); }
  BufferBuilder& u64(std::uint64_t value) { return put(value, 8); }
  // Text with a NUL, in a field of so many bytes.
  BufferBuilder& text(std::string_view characters, std::size_t width) {
    for (std::size_t i = 0; i < width; ++i)
      put(i < characters.size() ? static_cast<unsigned char>(characters[i]) : 0, 1);
    return *this;
  }
  PlistData take() { return std::move(bytes_); }

 private:
  BufferBuilder& put(std::uint64_t value, std::size_t width) {
    appendLittleEndian(bytes_, value, width);
    return *this;
  }
  PlistData bytes_;
};

// Statistics whose values belong together; all others are small counts.
struct KnownStat {
  std::uint32_t id;
  std::uint64_t value;
  std::size_t element = 0;
};

constexpr KnownStat kKnownStats[] = {
    {1, 7},               // version
    {2, 41'250'117},      // hostWriteXacts
    {3, 118'402'655},     // hostReadXacts
    {4, 2'147'483'648},   // hostWrites, in 4 KiB sectors: 8 TiB
    {7, 5'905'580'032},   // hostReads: 22 TiB
    {8, 61'440'000},      // validLbas
    {9, 812},             // shutdowns
    {10, 871},            // boots
    {11, 59},             // uncleanBoots
    {12, 41},             // IND_pool_free
    {13, 64},             // IND_pool_count
    {16, 1'503'238'553},  // gcWrites
    {17, 912},            // wearLevMoves
    {18, 5'368'709'120},  // nandWrites
    {19, 9'663'676'416},  // nandReads
    {20, 20'971'520},     // bandErases: at 1 MiB a band 2.5 units for each that the host wrote
    {22, 3},              // numPfail
    {23, 1},              // numEfail
    {28, 40'112},         // numSleepOps
    {34, 12'480},         // powerOnHours
    {36, 0},              // smartCritWarnings
    {45, 611},            // maxHighEnduranceBlockErases
    {48, 208},            // numFreeVirtualBlocks
    {49, 16'384},         // bytesPerPage
    {50, 64},             // pagesPerVirtualBlock
    {51, 16},             // blocksPerVirtualBlock
    {52, 4'096},          // numVirtualBlocks
    {53, 0x20005},        // exportVersion
    {56, 1'609'459'200},  // utilFormatTime: 2021-01-01
    {47, 4},              // numGrownBad
    {84, 8'388'608},      // intermediateBandErases
    {85, 0},              // intermediatePartitionStart
    {86, 256},            // userPartitionStart
    {124, 402},           // coldestCycle of the user's partition
    {124, 917, 1},        // and of the intermediate one
    {125, 611},           // hottestCycle of the user's partition
    {125, 1'304, 1},      // and of the intermediate one
    {129, 32},            // pagesPerVirtualBlockSlc
    {172, 0},             // ueccReads
    {204, 44'928'540},    // powerOnSeconds
    {367, 37},            // lhotSkipPercent
    {427, 0x4582},        // nandDesc
    {428, 1},             // fwUpdatesPercentUsed
    {429, 12},            // slcPercentUsed
    {430, 17},            // percentUsed
};

// Those that grow with the device's age: traffic, erases, hours, wear.
constexpr std::uint32_t kAgingStats[] = {2,  3,  4,  7,  9,  10, 11,  16,  17,  18,  19,  20, 22,
                                         23, 28, 34, 45, 47, 84, 124, 125, 204, 428, 429, 430};

std::uint64_t sampleStat(const StatDefinition& stat, std::size_t element, const SampleVariation& variation) {
  for (const KnownStat& known : kKnownStats) {
    if (known.id != stat.id || known.element != element) continue;
    const bool ages = std::ranges::find(kAgingStats, stat.id) != std::end(kAgingStats);
    return ages ? static_cast<std::uint64_t>(static_cast<double>(known.value) * variation.age) : known.value;
  }
  return (stat.id * 2654435761U >> 20) % 500 / (element + 1);
}

PlistData sampleStatistics(const SampleVariation& variation) {
  BufferBuilder out;
  for (const StatDefinition& stat : kStats) {
    const std::size_t count = std::max<std::size_t>(stat.limit, 1);
    out.u64(std::uint64_t{count} << 32 | stat.id);
    for (std::size_t i = 0; i < count; ++i) out.u64(sampleStat(stat, i, variation));
  }
  return out.take();
}

// Validity of 48 bands in four lists, in percent.
PlistData sampleBandStatistics() {
  constexpr std::uint32_t kBands = 48;
  BufferBuilder out;
  out.u32(kBands).u32(2).u64(0).u64(0);
  for (std::uint32_t band = 0; band < kBands; ++band)
    out.u32(band).u32(band % 4).u32(100 - band * 2).u32(0).u32(0);
  return out.take();
}

PlistData sampleTelemetry(std::uint32_t channels, std::uint32_t list) {
  constexpr std::uint32_t kWords = kNandCounterBlockSize / 4;
  BufferBuilder out;
  for (std::uint32_t channel = 0; channel < channels; ++channel) {
    for (std::uint32_t word = 0; word < kWords; ++word)
      out.u32((word * 2246822519U >> 18) % (900 + 100 * list) + channel);
  }
  for (std::uint32_t channel = 0; channel < channels; ++channel) {
    out.u32(5'200 + channel).u32(611 + list).u32(2).u32(31).u32(12).u32(list).u32(256).u32(0);
  }
  return out.take();
}

PlistData sampleDefects() {
  constexpr std::uint32_t kDefects = 5;
  BufferBuilder out;
  out.u32(0).u32(37).u32(kDefects);
  for (std::uint32_t i = 0; i < kDefects; ++i) {
    const std::uint32_t temperature = i == 0 ? 0xF9 : 28 + i;  // the first one happened at -7 degrees
    out.u32(i % 2 | (i / 2) << 16)
        .u32(i % 4)
        .u32(1'200 + 17 * i)
        .u32(300 + i)
        .u32(3 + i)
        .u32(std::uint64_t{40} * i)
        .u32(temperature)
        .u32(i % 3);
  }
  return out.take();
}

PlistData sampleTaskScheduler() {
  BufferBuilder out;
  for (std::uint64_t task = 0; task < 16; ++task)
    out.u32(task).u32(task * 250).u32(10'000 - task * 400).u32(0);
  return out.take();
}

constexpr std::uint32_t kSnapshots = 12;
constexpr std::uint32_t kSnapshotWords = 63;

PlistData sampleSnapshots() {
  BufferBuilder out;
  for (std::uint32_t interval = 0; interval < kSnapshots; ++interval) {
    for (std::uint32_t word = 0; word < kSnapshotWords; ++word) {
      out.u32(word == 0 ? 1'000 * (interval + 1) : (word * 97 + interval * 31) % 1'000);
    }
  }
  return out.take();
}

// Describes some fields of the same records.
PlistData sampleSnapshotHeader() {
  struct Field {
    std::uint16_t kind;
    std::uint32_t word;
    std::uint32_t size;
    std::string_view format;
  };
  constexpr std::array<Field, 7> kFields = {{{0, 0, 0, "T:%u "},
                                             {1, 1, 0, "P:%u "},
                                             {3, 2, 48, "W%s"},
                                             {3, 14, 48, "R%s"},
                                             {0, 27, 0, "HR:%u "},
                                             {0, 28, 0, "HW:%u "},
                                             {2, 39, 0, "TH:%u.%02u "}}};
  constexpr std::string_view kTitle = "Snapshots of the sample controller";
  constexpr std::uint32_t kFieldTable = 80;
  BufferBuilder out;
  out.u32(0).u32(6).u32(std::uint64_t{kSnapshotWords} * 4).u32(kSnapshots).u64(0).u32(kFieldTable).u64(0);
  out.text(kTitle, kFieldTable - 36);
  out.u32(kFields.size()).u32(0);
  for (const Field& field : kFields)
    out.u16(field.kind).u16(0).u32(std::uint64_t{field.word} * 4).u32(field.size).text(field.format, 16);
  return out.take();
}

PlistValue number(std::int64_t n) {
  return PlistValue::int64(n);
}

PlistArray sampleBuffers(const NandExporter& exporter, std::uint32_t channels,
                         const SampleVariation& variation) {
  PlistArray buffers;
  const auto add = [&](SelectorGetter selectors, PlistData bytes, std::uint32_t list = 0) {
    buffers.push_back(PlistValue::dictionary({{"method", number(exporter.dataMethod)},
                                              {"code", number(selectors()->dataFetch)},
                                              {"list", number(list)},
                                              {"data", PlistValue::data(std::move(bytes))}}));
  };
  add(exporter.statsSelectors, sampleStatistics(variation));
  add(exporter.bandStatsSelectors, sampleBandStatistics());
  for (std::uint32_t list = 0; list < 3; ++list)
    add(exporter.telemetryListSelectors, sampleTelemetry(channels, list), list);
  add(exporter.defectsListSelectors, sampleDefects());
  add(exporter.taskSchedulerSelectors, sampleTaskScheduler());
  add(exporter.snapshotSelectors, sampleSnapshots());
  add(exporter.snapshotHeaderSelectors, sampleSnapshotHeader());
  return buffers;
}

// An item of a kcdata buffer.
void addItem(BufferBuilder& out, std::uint32_t type, std::uint64_t flags,
             std::initializer_list<std::uint64_t> words) {
  out.u32(type).u32(words.size() * 8).u64(flags);
  for (const std::uint64_t word : words) out.u64(word);
}

void addThreadName(BufferBuilder& out, std::string_view name) {
  constexpr std::uint32_t kThreadName = 0x909;
  out.u32(kThreadName).u32(name.size() + 1).u64(0).text(name, name.size() + 1);
}

}  // namespace

PlistData sampleStackSnapshot() {
  constexpr std::uint32_t kContainerBegin = 0x13, kContainerEnd = 0x14, kIOStats = 0x901, kEnd = 0xF19158ED;
  constexpr std::uint64_t kTask = 1;
  constexpr std::array<std::string_view, 3> kThreads = {"VM_pageout", "VM_swapout", "VM_compressor"};
  BufferBuilder out;
  addItem(out, kContainerBegin, kTask, {0x902});
  for (std::uint64_t thread = 0; thread < kThreads.size(); ++thread) {
    addItem(out, kContainerBegin, 100 + thread, {0x903});
    addThreadName(out, kThreads[thread]);
    addItem(out, kIOStats, 0, {4'096 * thread, 11 + thread, 65'536, 3'327'320'064 + thread, 0});
    addItem(out, kContainerEnd, 100 + thread, {});
  }
  addItem(out, kContainerEnd, kTask, {});
  addItem(out, kEnd, 0, {});
  return out.take();
}

PlistDictionary sampleRegistry(std::string_view profile, const SampleVariation& variation) {
  constexpr std::uint32_t kChannels = 2;
  const NandExporter& exporter = nand_exporters[profile == "stx" ? 0 : 1];
  PlistDictionary client{{"kind", PlistValue::string("storage")},
                         {"buffers", PlistValue::array(sampleBuffers(exporter, kChannels, variation))}};
  if (exporter.recommendationMethod != kNoMethod) {
    client.set("recommendation",
               PlistValue::dictionary({{"method", number(exporter.recommendationMethod)},
                                       {"data", PlistValue::data(PlistData(4, std::byte{0}))}}));
  }
  const PlistValue characteristics =
      PlistValue::dictionary({{"chip-id", PlistValue::string(profile == "stx" ? "S3X" : "Q7A")},
                              {"manufacturer-id", PlistValue::string("4582603A5700")},
                              {"num-bus", number(kChannels)},
                              {"nand-device-desc", number(0x4582)}});
  const PlistValue parent = PlistValue::dictionary(
      {{"id", number(4294967500)},
       {"name", PlistValue::string("storage")},
       {"class", PlistValue::string("PlatformStorage")},
       {"properties",
        PlistValue::dictionary({{std::string(exporter.characteristicsKey), characteristics}})}});
  const PlistValue controller =
      PlistValue::dictionary({{"id", number(4294967501)},
                              {"name", PlistValue::string("controller")},
                              {"class", PlistValue::string(std::string(exporter.className))},
                              {"parent", number(4294967500)},
                              {"properties", PlistValue::dictionary({})},
                              {"client", PlistValue::dictionary(std::move(client))}});
  return {{"entries", PlistValue::array({parent, controller})}};
}

PlistArray sampleEccEvents() {
  PlistArray events;
  for (std::uint64_t event = 0; event < 2; ++event) {
    BufferBuilder out;
    out.u16((event + 1) | 3U << 8).u16(0).u32(0);  // an identifier, and three registers that count
    for (std::uint64_t i = 0; i < 8; ++i) out.u64(i < 3 ? 0x8000'0000'0000'0010 + 4096 * event + i : 0);
    events.push_back(PlistValue::data(out.take()));
  }
  return events;
}

}  // namespace tbdaily
