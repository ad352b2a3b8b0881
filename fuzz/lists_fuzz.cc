// The lists of a controller: band statistics, telemetry and defects, with characteristics and statistics of
// any kind. Records are numbers, no more of them than the buffers hold, and nothing stays open.
#include "fuzz/plist_input.h"
#include "storage/storage_test_support.h"
#include "storage/structured_logs.h"
#include "testing/fake_platform.h"

using namespace tbdaily;
using fuzz::Input;
using fuzz::require;

namespace {

constexpr std::uint32_t kBandStatistics = 11, kStatistics = 13, kDefects = 15, kTelemetry = 17;
constexpr std::array<std::string_view, 16> kWords = {"chip-id",
                                                     "manufacturer-id",
                                                     "num-bus",
                                                     "nand-device-desc",
                                                     "Q7A",
                                                     "Q8A",
                                                     "4582603A5700",
                                                     "98",
                                                     "45",
                                                     "AD",
                                                     "2C",
                                                     "EC",
                                                     "GeometryRaw",
                                                     "S5E",
                                                     "",
                                                     "89"};
constexpr std::size_t kRecordsOfDefects = 1, kTelemetryLists = 3, kChannelSize = 4096 + 32, kDefectSize = 32;

PlistValue characteristicsOf(Input& input) {
  const PlistValue described = fuzz::plistOfSection(input, kWords);
  if (input.flag()) return described;
  PlistDictionary typical = described.mutableDictionary();
  typical.set("chip-id", PlistValue::string(input.wordOrText(kWords)));
  typical.set("manufacturer-id", PlistValue::string(input.wordOrText(kWords)));
  typical.set("num-bus", PlistValue::int64(input.integer()));
  return PlistValue::dictionary(std::move(typical));
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Input input(data, size);
  testing::FakePlatform fake;
  const std::size_t options = input.number<std::uint8_t>();
  const bool isFirstClass = (options & 1) != 0;
  testing::ScriptedController controller(fake.driverRegistry,
                                         isFirstClass ? "STXStorage" : "VelmoraEmbeddedNVMeController");
  fake.driverRegistry.drivers[0].properties.set(
      isFirstClass ? "Device Characteristics" : "Controller Characteristics", characteristicsOf(input));
  if ((options & 2) != 0) controller.sizeAnswer = input.number<std::uint16_t>();
  if ((options & 4) != 0) controller.filled = input.number<std::uint16_t>();
  if ((options & 8) != 0) controller.dataStatus = kKdError;
  gStorageLogState = {};
  gStorageLogState.gForceCollectionSet = (options & 16) != 0;
  std::size_t largest = controller.sizeAnswer.value_or(0);
  for (const std::uint32_t list : {kBandStatistics, kStatistics, kDefects, kTelemetry}) {
    auto bytes = list == kTelemetry ? input.rest() : input.section();
    std::vector<std::byte>& buffer = controller.buffers[list];
    buffer.assign(bytes.begin(), bytes.end());
    // A block of counters is longer than an input may be.
    if (list == kTelemetry) buffer.resize(buffer.size() + input.number<std::uint16_t>() % 3 * kChannelSize);
    largest = std::max(largest, buffer.size());
  }

  (void)DumpStorageStructuredLog(fake.platform, (options & 32) != 0);
  require(fake.driverRegistry.openHandles() == 0, "no handle stays open");
  const std::size_t most =
      kRecordsOfDefects + largest / kDefectSize + kTelemetryLists * (largest / kChannelSize);
  require(fake.logSubmission.structured.size() <= most, "no more records than the buffers hold");
  for (const auto& [type, record] : fake.logSubmission.structured) {
    require(type == kStorageLogType, "records are of the storage's type");
    for (const auto& [key, value] : record) require(value.asInteger().has_value(), "records hold integers");
  }
  return 0;
}
