// A day's work on a device whose recordings are the input: what it leaves behind reads, and nothing stays
// open.
#include <filesystem>
#include <fstream>
#include <iterator>

#include "driver/daily_tasks.h"
#include "fuzz/plist_input.h"
#include "platform/linux/linux_platform.h"
#include "platform/linux/replay/recordings.h"
#include "platform/plist/codec.h"
#include "platform/plist/json.h"
#include "report/internal_device.h"
#include "testing/temporary_folder.h"

using namespace tbdaily;
using fuzz::Input;
using fuzz::require;

namespace {

namespace fs = std::filesystem;

constexpr std::array<std::string_view, 62> kWords = {"entries",
                                                     "id",
                                                     "name",
                                                     "class",
                                                     "parent",
                                                     "retainCount",
                                                     "properties",
                                                     "client",
                                                     "kind",
                                                     "storage",
                                                     "hub",
                                                     "openStatus",
                                                     "closeStatus",
                                                     "recommendation",
                                                     "method",
                                                     "data",
                                                     "status",
                                                     "buffers",
                                                     "code",
                                                     "list",
                                                     "file",
                                                     "size",
                                                     "fill",
                                                     "sizeStatus",
                                                     "dataStatus",
                                                     "userClientOpenStatus",
                                                     "configureStatus",
                                                     "mapStatus",
                                                     "updateStatus",
                                                     "channels",
                                                     "driver",
                                                     "channel",
                                                     "type",
                                                     "elements",
                                                     "stamp",
                                                     "words",
                                                     "KdReportHub",
                                                     "KdReportLegend",
                                                     "KdReportLegendPublic",
                                                     "KdReportChannels",
                                                     "STXStorage",
                                                     "VelmoraEmbeddedNVMeController",
                                                     "Device Characteristics",
                                                     "Controller Characteristics",
                                                     "chip-id",
                                                     "manufacturer-id",
                                                     "num-bus",
                                                     "InternalBuild",
                                                     "MultiUser",
                                                     "DiskUsage",
                                                     "TotalDiskCapacity",
                                                     "TotalDataAvailable",
                                                     "bundleName",
                                                     "procName",
                                                     "since",
                                                     "wifiInBytes",
                                                     "wwanOutBytes",
                                                     "ProductBuildVersion",
                                                     "snapshot.kcdata",
                                                     "eccEvents",
                                                     "HardwareModel",
                                                     "x"};
constexpr DayNumber kDay = 20000;
constexpr const char* kReport = ".193";
constexpr std::string_view kConsent =
    "<plist><dict><key>DiagnosticLogSubmissionEnabled</key><true/></dict></plist>";
constexpr std::string_view kWhitelist =
    "<plist><dict><key>All</key><dict><key>ScalarKeyPrefixes</key><dict><key>com.</key>"
    "<dict><key>sig_fig</key><integer>2</integer></dict><key>datausage.</key><dict/></dict></dict></dict></"
    "plist>";

PlistCodec codec;

void put(const fs::path& place, std::string_view contents) {
  fs::create_directories(place.parent_path());
  std::ofstream(place, std::ios::binary) << contents;
}

std::size_t openFiles() {
  const fs::directory_iterator all("/proc/self/fd");
  return static_cast<std::size_t>(std::distance(fs::begin(all), fs::end(all)));
}

void putRecording(const fs::path& root, std::string_view name, const PlistValue& value) {
  put(root / "System/Device" / name, codec.write(value, PlistForm::Carried).bytes);
}

// A reply is to come at once, since a run waits for it.
PlistValue usageOf(Input& input) {
  PlistValue records = fuzz::plistOfSection(input, kWords);
  if (records.get("records").asArray() != nullptr) records = records.get("records");
  if (records.asArray() == nullptr)
    records = PlistValue::array({records.isNone() ? PlistValue::boolean(true) : records});
  return PlistValue::dictionary({{"records", records}});
}

std::string contentsOf(const fs::path& place) {
  std::ifstream file(place, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), {}};
}

void leavesReadableFiles(const fs::path& folder) {
  for (const auto& entry : fs::recursive_directory_iterator(folder)) {
    const std::string extension = entry.path().extension();
    require(!entry.path().filename().string().starts_with(".tmp-"), "no file is left half-written");
    if (extension == ".plist" || extension == kReport) {
      const std::string bytes = contentsOf(entry.path());
      require(!codec.parse(std::as_bytes(std::span(bytes))).value.isNone(), "what the day wrote, reads");
    }
    if (extension != ".jsonl") continue;
    std::ifstream records(entry.path(), std::ios::binary);
    for (std::string line; std::getline(records, line);)
      require(!plistFromJson(line).value.isNone(), "each record of the day reads");
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Input input(data, size);
  const testing::TemporaryFolder folder;
  const fs::path& root = folder.path();
  putRecording(root, recording::kUsage, usageOf(input));
  putRecording(
      root, recording::kClock,
      PlistValue::dictionary({{"now", PlistValue(PlistDate::fromUnixSeconds((kDay + 1) * 86400.0))}}));
  for (const std::string_view file : {recording::kAnswers, recording::kHub, recording::kKernel}) {
    const PlistValue value = fuzz::plistOfSection(input, kWords);
    if (!value.isNone()) putRecording(root, file, value);
  }
  const auto snapshot = input.section();
  put(root / "System/Device" / recording::kStackSnapshot,
      {reinterpret_cast<const char*>(snapshot.data()), snapshot.size()});
  putRecording(root, recording::kRegistry, fuzz::plistOf(input, kWords));

  // What the first day records is in the report of the second one.
  put(root / "Library/Application Support/Tallybook/Whitelist_Nimbos.plist", kWhitelist);
  put(root / "var/mobile/Library/Preferences/com.velmora.Crashferry.plist", kConsent);

  gInternalDeviceAnswer.once.reset();
  const std::size_t before = openFiles();
  {
    LinuxPlatform device(Host(root, false));
    for (const DayNumber day : {kDay, kDay + 1}) RunDailyTasks(device.services(), day, {});
  }
  require(openFiles() == before, "no file stays open");
  leavesReadableFiles(root / "var");
  return 0;
}
