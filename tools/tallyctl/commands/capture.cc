// tallyctl capture: what the live host answers at this moment, as recordings.

#include <CLI/CLI.hpp>
#include <algorithm>
#include <array>
#include <filesystem>

#include "platform/families.h"
#include "platform/linux/base/host_notes.h"
#include "platform/linux/linux_app_registry.h"
#include "platform/linux/live/live_recording.h"
#include "platform/plist/codec.h"
#include "tools/tallyctl/outcome.h"
#include "tools/tallyctl/tool.h"

namespace tbdaily {

namespace {

PlistValue text(std::string_view value) {
  return PlistValue::string(std::string(value));
}

PlistValue texts(const std::vector<std::string>& values) {
  PlistArray array;
  for (const std::string& value : values) array.push_back(text(value));
  return PlistValue::array(std::move(array));
}

// The live host, whatever the device has recorded.
struct Source {
  explicit Source(const Host& of) : host(of.withoutRecordings()), platform(host) {}

  const Host host;
  LinuxPlatform platform;
  PlistCodec codec;
  Recordings none{host, codec};
};

// Files by their names; or why the source cannot be read.
using Captured = Outcome<std::vector<std::pair<std::string_view, PlistDictionary>>>;

Captured captureClock(Source& source) {
  Kernel& kernel = source.platform.services().kernel;
  PlistDictionary clock{{"now", PlistValue(kernel.currentTime())},
                        {"ticks", PlistValue::int64(static_cast<std::int64_t>(kernel.tickCount()))}};
  if (const auto timebase = kernel.timebase()) {
    clock.set("numerator", PlistValue::int64(timebase->numerator));
    clock.set("denominator", PlistValue::int64(timebase->denominator));
  }
  return {{{recording::kClock, std::move(clock)}}};
}

Captured captureAnswers(Source& source) {
  Platform& services = source.platform.services();
  PlistDictionary answers;
  answers.set("DiskUsage", services.deviceAnswers.copyAnswer("DiskUsage"));
  if (const auto build = services.deviceAnswers.currentOSBuildVersion())
    answers.set("ProductBuildVersion", text(*build));
  if (const auto multiUser = services.deviceAnswers.multiUserMode())
    answers.set("MultiUser", PlistValue::boolean(*multiUser));
  const std::array<std::pair<std::string_view, std::string>, 4> named{
      {{"ProductVersion", services.logSubmission.currentOSVersion()},
       {"SystemIdentifier", services.logSubmission.systemIdentifier()},
       {"HardwareModel", services.logSubmission.hardwareModel()},
       {"SystemVersion", services.logSubmission.systemVersion()}}};
  for (const auto& [key, value] : named) {
    if (!value.empty()) answers.set(key, text(value));
  }
  return {{{recording::kAnswers, std::move(answers)}}};
}

Captured captureKernel(Source& source) {
  constexpr std::string_view kSwapUsage = "vm.swapusage";
  PlistData record(32);
  std::size_t length = record.size();
  if (source.platform.services().kernel.sysctlByName(kSwapUsage, record, length) != 0)
    return Failure{"the use of swap space cannot be read"};
  record.resize(length);
  const PlistDictionary values{{std::string(kSwapUsage), PlistValue::data(std::move(record))}};
  return {{{recording::kKernel, {{"sysctl", PlistValue::dictionary(values)}}}}};
}

Captured captureApps(Source& source) {
  PlistArray bundles;
  for (const LiveApplication& application : liveApplications(source.host))
    bundles.push_back(PlistValue::dictionary(
        {{"identifier", text(application.identifier)}, {"type", text(application.type)}}));
  return {{{recording::kApps, {{"bundles", PlistValue::array(std::move(bundles))}}}}};
}

Captured captureLocale(Source& source) {
  LocaleSettings& locale = source.platform.services().localeSettings;
  PlistDictionary settings{{"preferredLanguages", texts(locale.preferredLanguages())},
                           {"systemLanguages", texts(locale.systemLanguages())}};
  if (const auto country = locale.countryCode()) settings.set("countryCode", text(*country));
  return {{{recording::kLocale, std::move(settings)}}};
}

Captured captureNvme(Source& source) {
  Readings readings;
  const NvmePages found = readNvmePages(LiveDiscovery(source.host.livePath("/"), readings));
  std::string unread;
  for (const std::string& name : found.unread) unread.append(unread.empty() ? "" : ", ").append(name);
  if (!unread.empty())
    return Failure{"the health of " + unread + " cannot be read, which takes the rights of root"};
  PlistDictionary controllers;
  for (const auto& [name, page] : found.pages)
    controllers.set(name, PlistValue::data(PlistData(page.begin(), page.end())));
  return {{{recording::kNvme, {{"controllers", PlistValue::dictionary(std::move(controllers))}}}}};
}

Captured captureRegistry(Source& source) {
  LiveRecording recorded = recordLiveHost(LiveHost(source.host.livePath("/"), source.none));
  return {{{recording::kRegistry, std::move(recorded.registry)}, {recording::kHub, std::move(recorded.hub)}}};
}

struct Subject {
  std::string_view name;
  Captured (*capture)(Source& source);
  std::vector<std::string_view> files;
};
const std::array<Subject, 7> kSubjects{{
    {"registry", captureRegistry, {recording::kRegistry, recording::kHub}},
    {"nvme", captureNvme, {recording::kNvme}},
    {"answers", captureAnswers, {recording::kAnswers}},
    {"kernel", captureKernel, {recording::kKernel}},
    {"apps", captureApps, {recording::kApps}},
    {"locale", captureLocale, {recording::kLocale}},
    {"clock", captureClock, {recording::kClock}},
}};

struct Request {
  std::vector<std::string> only;
  std::string to;
  bool replace = false;
};

class Capture {
 public:
  Capture(Tool& tool, const Host& device) : tool_(tool), device_(device) {}

  void run(const Request& request, const Host& live) {
    Source source(live);
    DeviceFolder folder;
    if (const int error = device_.files().makeFolder(recording::kFolder, folder); error != 0)
      return tool_.fail(device_.files().place(recording::kFolder).native() +
                        " cannot be made: " + errorText(error));
    std::vector<const Subject*> chosen;
    for (const Subject& subject : kSubjects) {
      const bool isChosen =
          request.only.empty() || std::ranges::find(request.only, subject.name) != request.only.end();
      if (isChosen) chosen.push_back(&subject);
    }
    for (const Subject* subject : chosen) {
      for (const std::string_view file : subject->files) {
        if (!request.replace && folder.has(std::string(file)))
          return tool_.fail(folder.place(file).native() + " is there; --replace takes its place");
      }
    }
    for (const Subject* subject : chosen) {
      Captured captured = subject->capture(source);
      if (!captured && !request.replace) return tool_.fail(captured.reason() + "; nothing was written");
      if (!captured) unread_.emplace_back(subject, captured.reason());
      if (captured) std::ranges::move(*captured, std::back_inserter(files_));
    }
    if (store(folder)) show(request);
  }

 private:
  bool store(const DeviceFolder& folder) {
    for (const auto& [file, root] : files_) {
      const PlistWriteResult written = codec_.write(PlistValue::dictionary(root), PlistForm::Exact);
      const int error = written.ok ? folder.replaceFile(std::string(file), written.bytes) : EINVAL;
      if (error == 0) continue;
      tool_.fail(folder.place(file).native() +
                 " cannot be written: " + (written.ok ? errorText(error) : written.error));
      return false;
    }
    // What is not known any more must not be reported as if it were of today.
    for (const auto& [subject, reason] : unread_) {
      for (const std::string_view file : subject->files) {
        if (folder.has(std::string(file))) folder.remove(std::string(file));
      }
    }
    if (const int error = folder.sync(); error != 0) {
      tool_.fail(folder.place("").native() + " cannot be forced to storage: " + errorText(error));
      return false;
    }
    return true;
  }

  void show(const Request& request) {
    const std::string root = device_.root().native();
    std::string reasons;
    for (const auto& [subject, reason] : unread_) reasons.append(reasons.empty() ? "" : "; ").append(reason);
    const auto write = [&](JsonWriter& json) {
      const auto object = json.object();
      json.add("root", root);
      const auto files = json.array("files");
      for (const auto& [file, recorded] : files_) json.add(file);
    };
    if (!tool_.printedAsJson(write)) {
      for (const auto& [file, recorded] : files_)
        tool_.out().line(device_.files().place(Recordings::path(file)).native());
      if (!request.to.empty() && unread_.empty())
        tool_.out().line("replay it with: TBDAILY_ROOT=" + root + " tbdaily -f");
    }
    if (!reasons.empty()) tool_.fail(reasons + "; what was recorded of it is gone");
  }

  Tool& tool_;
  const Host& device_;
  PlistCodec codec_;
  std::vector<std::pair<std::string_view, PlistDictionary>> files_;
  std::vector<std::pair<const Subject*, std::string>> unread_;
};

void runCapture(Tool& tool, const Request& request) {
  for (const std::string& name : request.only) {
    if (std::ranges::find(kSubjects, name, &Subject::name) == kSubjects.end())
      return tool.fail("there is no recording \"" + name +
                           "\"; there are registry, nvme, answers, kernel, apps, locale, clock",
                       kWrongUsage);
  }
  if (request.only.empty() == request.to.empty())
    return tool.fail(
        "say what to record into this device, --only NAME,..., or where to make a device of its own, --to "
        "DIR",
        kWrongUsage);
  if (!request.only.empty()) {
    if (!tool.hasUsableRoot()) return;
    const Host& device = tool.platform().host();
    if (!device.live()) return tool.fail("live sources are off (TBDAILY_LIVE=0)");
    return Capture(tool, device).run(request, device);
  }
  std::error_code error;
  std::filesystem::create_directories(request.to, error);
  if (error) return tool.fail(request.to + " cannot be made: " + error.message());
  const Host device(std::filesystem::absolute(request.to, error), true);
  if (!Host::fromEnvironment().live()) return tool.fail("live sources are off (TBDAILY_LIVE=0)");
  Capture(tool, device).run(request, device);
}

}  // namespace

void addCaptureCommand(CLI::App& app, Tool& tool) {
  CLI::App* command = app.add_subcommand(
      "capture", "Record what the live host answers, so that this machine can be replayed anywhere");
  auto request = std::make_shared<Request>();
  CLI::Option* only =
      command
          ->add_option(
              "--only", request->only,
              "Into this device: registry (with its hub), nvme, answers, kernel, apps, locale, clock")
          ->delimiter(',')
          ->type_name("NAME,...");
  command->add_option("--to", request->to, "All of them, into a device of its own")
      ->type_name("DIR")
      ->excludes(only);
  command->add_flag("--replace", request->replace,
                    "Replace what is recorded; what cannot be read loses its recording");
  command->callback([&tool, request] { runCapture(tool, *request); });
}

}  // namespace tbdaily
