#include "tools/tallyctl/sample/device.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <vector>

#include "driver/daily_tasks.h"
#include "driver/environment_probes.h"
#include "platform/analytics_home.h"
#include "platform/linux/base/host_notes.h"
#include "platform/linux/replay/recordings.h"
#include "platform/linux/store/analytics_store.h"
#include "platform/preferences_store.h"
#include "platform/property_list_codec.h"
#include "report/tb_config.h"
#include "tools/tallyctl/input_file.h"
#include "tools/tallyctl/sample/controller.h"
#include "tools/tallyctl/sample/history.h"
#include "tools/tallyctl/sample/metrics.h"
#include "tools/tallyctl/sample/whitelist.h"

namespace tbdaily {

namespace fs = std::filesystem;

namespace {

std::string recordingPath(std::string_view file) {
  return std::string(recording::kFolder).append("/").append(file);
}

PlistValue text(std::string_view t) {
  return PlistValue::string(std::string(t));
}

PlistArray texts(std::initializer_list<const char*> list) {
  PlistArray array;
  for (const char* element : list) array.push_back(text(element));
  return array;
}

PlistDictionary sampleAnswers(const SampleProfile& profile) {
  return {{"InternalBuild", PlistValue::boolean(false)},
          {"MultiUser", PlistValue::boolean(false)},
          {"DiskUsage", PlistValue::dictionary({{"TotalDiskCapacity", PlistValue::int64(255'866'126'336)},
                                                {"TotalDataAvailable", PlistValue::int64(96'481'509'376)}})},
          {"InverseDeviceID", text("b41c77e0a9d24d0c8f5e61d27a3f9c10")},
          {"ProductBuildVersion", text("4N117")},
          {"ProductVersion", text("4.2.1")},
          {"SystemVersion", text("Nimbos 4.2.1 (4N117)")},
          {"SystemIdentifier", text("f2d8c0c75b3a4cd8a4a1c1b6d8a1f7e3")},
          {"HardwareModel", text(profile.hardwareModel)}};
}

PlistDictionary sampleKernel() {
  PlistData swap(32, std::byte{0});  // total 1 GiB, all of it available
  swap[3] = std::byte{0x40};
  swap[11] = std::byte{0x40};
  swap[25] = std::byte{0x40};  // pages of 16 KiB
  return {{"sysctl", PlistValue::dictionary(
                         {{"kern.memorystatus_freeze_count", PlistValue::int64(37)},
                          {"kern.memorystatus_freeze_pageouts", PlistValue::int64(812'334)},
                          {"kern.memorystatus_freeze_budget_pages_remaining", PlistValue::int64(51'200)},
                          {"kern.memorystatus_thaw_count", PlistValue::int64(29)},
                          {"vm.swapusage", PlistValue::data(std::move(swap))}})},
          {"eccEvents", PlistValue::array(sampleEccEvents())}};
}

PlistDictionary sampleLocale() {
  return {{"preferredLanguages", PlistValue::array(texts({"de-AT", "en-GB"}))},
          {"systemLanguages", PlistValue::array(texts({"en", "de", "fr", "es", "ja"}))},
          {"countryCode", text("AT")}};
}

PlistDictionary sampleBundles() {
  PlistArray bundles;
  for (const SampleApp& app : sampleApps()) {
    bundles.push_back(PlistValue::dictionary(
        {{"identifier", text(app.identifier)}, {"type", text(app.isUserApp ? "User" : "System")}}));
  }
  return {{"bundles", PlistValue::array(std::move(bundles))}};
}

// Scheduled, not yet applied: keeps one group of the whitelist switched off and another one on.
PlistDictionary sampleTasking() {
  const auto item = [](std::string_view key, PlistValue value) {
    return PlistValue::dictionary({{"Domain", text(preference_domain::kTaskingValues)},
                                   {"Key", text(key)},
                                   {"Value", std::move(value)}});
  };
  return {{"TaskingID", text("sample-tasking-1")},
          {"TaskingDigest", text("6f1ed002ab5595859014ebf0951522d9")},
          {"TaskingPayload", PlistValue::array({item("Experiments", PlistValue::boolean(false)),
                                                item("Network", PlistValue::boolean(true))})}};
}

// The storage controller's entries, then those of the drivers that publish metrics.
PlistDictionary sampleDrivers(const SampleRequest& request) {
  PlistDictionary registry = sampleRegistry(request.profile->name, request.variation);
  PlistArray entries = *registry.get("entries").asArray();
  for (PlistValue& entry : sampleMetricsEntries()) entries.push_back(std::move(entry));
  registry.set("entries", PlistValue::array(std::move(entries)));
  return registry;
}

// A property list that the sample device begins with.
struct SampleFile {
  std::string path;  // as the device sees it
  PlistDictionary root;
};

std::vector<SampleFile> sampleFiles(const SampleRequest& request, DayNumber today) {
  const auto preferences = [](std::string_view domain) {
    return "/var/mobile/Library/Preferences/" + std::string(domain) + ".plist";
  };
  return {{std::string(kWhitelistPath), sampleWhitelist()},
          {recordingPath(recording::kAnswers), sampleAnswers(*request.profile)},
          {recordingPath(recording::kKernel), sampleKernel()},
          {recordingPath(recording::kLocale), sampleLocale()},
          {recordingPath(recording::kApps), sampleBundles()},
          {recordingPath(recording::kRegistry), sampleDrivers(request)},
          {recordingPath(recording::kHub), sampleHub()},
          {recordingPath(recording::kUsage),
           {{"records", PlistValue::array(sampleUsageRecords(today, request.variation))}}},
          {preferences(preference_domain::kLogSubmission),
           {{"DiagnosticLogSubmissionEnabled", PlistValue::boolean(true)},
            {"ScheduledTasking", PlistValue::dictionary(sampleTasking())}}},
          {preferences(preference_domain::kTaskingValues), {{"Experiments", PlistValue::boolean(false)}}},
          {preferences(preference_domain::kAnalytics), {{"DatabaseCorruptionCount", PlistValue::int32(1)}}}};
}

// Beside the program in a build tree, in the library folder of an installation.
fs::path builtSupportLibrary() {
  std::error_code error;
  const fs::path program = fs::read_symlink("/proc/self/exe", error);
  for (const fs::path& place :
       {program.parent_path() / "FaultdeskSupport",
        program.parent_path().parent_path() / TBDAILY_SUPPORT_LIBRARY_FOLDER / "FaultdeskSupport"}) {
    if (fs::exists(place, error)) return place;
  }
  return {};
}

class SampleDevice {
 public:
  SampleDevice(LinuxPlatform& platform, const SampleRequest& request)
      : platform_(platform), request_(request), host_(platform.host()) {}

  Outcome<Nothing> make() {
    if (const int error = makeRoot(); error != 0) {
      return Failure{host_.root().native() + " cannot be made: " + errorText(error)};
    }
    const DayNumber today = platform_.services().analyticsClient.currentDayNumber();
    const std::vector<SampleFile> files = sampleFiles(request_, today);
    const StorePlace store = storePlaceOf(host_.files(), analyticsDatabasePath("/var/mobile"));
    if (const std::string taken = firstTaken(files); !taken.empty()) {
      return Failure{
          taken + " is already there; a sample device is never made over another one: choose an empty root"};
    }
    auto library = supportLibrary();
    if (!library) return Failure{library.reason()};
    auto made = fill(files, *library, store, dayBefore(today));
    if (!made) undo();
    return made;
  }

 private:
  int makeRoot() {
    std::error_code error;
    madeRoot_ = fs::create_directories(host_.root(), error);
    return error.value();
  }

  Outcome<Nothing> fill(const std::vector<SampleFile>& files, const std::vector<std::byte>& library,
                        const StorePlace& store, DayNumber yesterday) {
    for (const SampleFile& file : files) {
      if (auto written = writePlist(file); !written) return written;
    }
    if (auto written = writeBytes(recordingPath(recording::kStackSnapshot), sampleStackSnapshot()); !written)
      return written;
    if (auto placed = writeBytes(kSupportLibraryPath, library); !placed) return placed;
    for (const std::string& name : {store.name, storeLogOf(store.name), store.name + "-shm"})
      written_.push_back(store.folder + "/" + name);
    AnalyticsStore analytics(store);
    const DayNumber first = yesterday - request_.days + 1;
    if (auto reason = addSampleHistory(analytics, first, yesterday, request_.variation))
      return Failure{std::move(*reason)};
    return Nothing{};
  }

  // Takes away what was written, and the folders that are empty then.
  void undo() const {
    for (const std::string& path : written_) {
      const fs::path whole(path);
      DeviceFolder folder;
      if (host_.files().openFolder(whole.parent_path().native(), folder) == 0)
        folder.remove(whole.filename());
      for (fs::path step = whole.parent_path(); step != step.root_path(); step = step.parent_path()) {
        DeviceFolder above;
        if (host_.files().openFolder(step.parent_path().native(), above) != 0 ||
            ::unlinkat(above.descriptor(), step.filename().c_str(), AT_REMOVEDIR) != 0)
          break;
      }
    }
    std::error_code ignored;
    if (madeRoot_) fs::remove(host_.root(), ignored);
  }

  std::string firstTaken(const std::vector<SampleFile>& files) const {
    std::vector<std::string> paths{analyticsDatabasePath("/var/mobile"), std::string(kSupportLibraryPath),
                                   recordingPath(recording::kStackSnapshot)};
    for (const SampleFile& file : files) paths.push_back(file.path);
    for (const std::string& path : paths) {
      DeviceFolder folder;
      const fs::path whole(path);
      const int error = host_.files().openFolder(whole.parent_path().native(), folder);
      if (error != ENOENT && (error != 0 || folder.has(whole.filename())))
        return host_.files().place(path).native();
    }
    return {};
  }

  Outcome<Nothing> writePlist(const SampleFile& file) {
    const PlistWriteResult written =
        platform_.services().propertyListCodec.write(PlistValue::dictionary(file.root));
    if (!written.ok) return Failure{file.path + ": " + written.error};
    return writeText(file.path, written.bytes);
  }

  Outcome<Nothing> writeBytes(std::string_view path, const std::vector<std::byte>& bytes) {
    return writeText(path, {reinterpret_cast<const char*>(bytes.data()), bytes.size()});
  }

  Outcome<Nothing> writeText(std::string_view path, std::string_view text) {
    written_.emplace_back(path);
    const fs::path whole(path);
    DeviceFolder folder;
    int error = host_.files().makeFolder(whole.parent_path().native(), folder);
    if (error == 0) error = folder.replaceFile(whole.filename(), text);
    if (error != 0) return Failure{host_.files().place(path).native() + ": " + errorText(error)};
    return Nothing{};
  }

  static Outcome<std::vector<std::byte>> supportLibrary() {
    const fs::path built = builtSupportLibrary();
    if (built.empty())
      return Failure{
          "the support library FaultdeskSupport is missing beside tallyctl; build or install it again"};
    return readInput(built, kLargestBufferInput);
  }

  LinuxPlatform& platform_;
  const SampleRequest& request_;
  const Host& host_;
  std::vector<std::string> written_;  // paths of the device
  bool madeRoot_ = false;
};

}  // namespace

Outcome<Nothing> makeSampleDevice(LinuxPlatform& platform, const SampleRequest& request) {
  return SampleDevice(platform, request).make();
}

}  // namespace tbdaily
