#include "platform/linux/linux_device_answers.h"

#include <sys/statvfs.h>

#include "platform/linux/os_release.h"

namespace tbdaily {

namespace {

PlistValue liveDiskUsage(const Host& host) {
  struct statvfs usage {};
  if (::statvfs(host.root().c_str(), &usage) != 0) return {};
  const std::uint64_t blockSize = usage.f_frsize;
  return PlistValue::dictionary(
      {{"TotalDiskCapacity", PlistValue::int64(static_cast<std::int64_t>(usage.f_blocks * blockSize))},
       {"TotalDataAvailable", PlistValue::int64(static_cast<std::int64_t>(usage.f_bavail * blockSize))}});
}

}  // namespace

bool LinuxDeviceAnswers::booleanAnswer(std::string_view question) {
  return recordings_.entry(recording::kAnswers, question).asBoolean().value_or(false);
}

PlistValue LinuxDeviceAnswers::copyAnswer(std::string_view question) {
  PlistValue recorded = recordings_.entry(recording::kAnswers, question);
  if (recorded.isNone() && host_.live() && question == "DiskUsage") return liveDiskUsage(host_);
  return recorded;
}

std::optional<std::string> LinuxDeviceAnswers::currentOSBuildVersion() {
  const PlistValue recorded = recordings_.entry(recording::kAnswers, "ProductBuildVersion");
  if (const auto text = recorded.asString()) return std::string(*text);
  if (!host_.live()) return std::nullopt;
  auto build = osReleaseValue(host_, "BUILD_ID");
  return build ? build : osReleaseValue(host_, "VERSION_ID");
}

std::optional<bool> LinuxDeviceAnswers::multiUserMode() {
  const PlistValue recorded = recordings_.entry(recording::kAnswers, "MultiUser");
  if (!recorded.isNone()) return recorded.asBoolean();
  return host_.live() ? std::optional<bool>(false) : std::nullopt;
}

SystemGroupContainer LinuxDeviceAnswers::systemGroupContainerPath(std::string_view identifier) {
  constexpr std::uint64_t kNoSuchContainer = 2;
  const PlistValue path = recordings_.entry(recording::kAnswers, "GroupContainers").get(identifier);
  if (const auto text = path.asString()) return {std::string(*text), 0};
  return {std::nullopt, kNoSuchContainer};
}

}  // namespace tbdaily
