#include "driver/device_metrics.h"

#include <array>
#include <string>
#include <vector>

#include "driver/data_usage.h"
#include "driver/driver_metrics.h"
#include "driver/step.h"
#include "platform/analytics_client.h"
#include "platform/byte_reader.h"
#include "platform/device_answers.h"
#include "platform/kernel.h"
#include "platform/log_submission.h"
#include "platform/system_log.h"
#include "storage/freezer_writes.h"
#include "storage/nand_info.h"
#include "storage/structured_logs.h"

namespace tbdaily {

namespace {

struct DiskFigure {
  std::string_view scalarKey;
  std::string_view answerKey;  // in the "DiskUsage" answer, in bytes
};

constexpr std::array<DiskFigure, 2> kDiskFigures = {{
    {"com.velmora.homedeck.DiskUsageUserTotalBlocks", "TotalDiskCapacity"},
    {"com.velmora.homedeck.DiskUsageUserBlocksFree", "TotalDataAvailable"},
}};
constexpr std::int64_t kNotAvailable = -1;
constexpr unsigned kMiBShift = 20;

// The kernel's record of an ECC event: id, count, alignment to 8 bytes, eight registers.
constexpr std::size_t kEccRecordSize = 72;
constexpr std::size_t kEccRegisters = 8;
constexpr std::size_t kEccFirstRegister = 8;
constexpr int kEccLogType = 172;
constexpr int kMostEccEvents = 10;
constexpr int kNoSuchEntry = 2;  // ENOENT: no event is left
constexpr int kBusy = 16;        // EBUSY

PlistDictionary eccEventLog(std::span<const std::byte> record) {
  const ByteReader reader(record);
  const std::uint8_t count = *reader.at<std::uint8_t>(1);
  PlistDictionary event{{"id", PlistValue::int64(*reader.at<std::uint8_t>(0))},
                        {"count", PlistValue::int64(count)}};
  for (std::size_t i = 0; i < count && i < kEccRegisters; ++i) {
    const auto value = *reader.at<std::uint64_t>(kEccFirstRegister + 8 * i);
    event.set("reg" + std::to_string(i), PlistValue::int64(static_cast<std::int64_t>(value)));
  }
  return event;
}

}  // namespace

void CollectDiskUsage(Platform& platform) {
  const PlistValue answer = platform.deviceAnswers.copyAnswer("DiskUsage");
  std::vector<ScalarFigure> figures;
  for (const DiskFigure& figure : kDiskFigures) {
    const auto bytes = answer.get(figure.answerKey).asNumber();
    const std::int64_t mebibytes = bytes ? bytes->toInt64() >> kMiBShift : kNotAvailable;
    figures.push_back({figure.scalarKey, mebibytes});
  }
  platform.analyticsClient.setValuesForScalarKeys(figures);
}

PlistDictionary currentNANDInfo(Platform& platform) {
  PlistDictionary info = CopyNANDInfo(platform);
  if (info.empty()) return info;
  for (const auto& [key, value] : CopyVMFreezerNANDInfo(platform)) info.set(key, value);
  return info;
}

void CollectNANDInfo(Platform& platform) {
  const PlistDictionary info = currentNANDInfo(platform);
  if (info.empty()) {
    platform.systemLog.message(LogLevel::Default, "failed to get NAND info dict");
    return;
  }
  if (const PlistValue* error = info.find(kNANDInfoErrorKey)) {
    platform.systemLog.message(LogLevel::Default, "error reading nand info, error %@ with message %@", *error,
                               info.get(kNANDInfoErrorMessageKey));
    return;
  }
  std::vector<ScalarFigure> figures;
  figures.reserve(info.size());
  for (const auto& [key, value] : info) {
    const auto number = value.asNumber();
    if (number) figures.push_back({key, number->toInt64()});
  }
  platform.analyticsClient.setValuesForScalarKeys(figures);
}

void CollectECCEvents(Platform& platform) {
  std::array<std::byte, kEccRecordSize> record{};
  std::size_t length = record.size();  // later reads pass what the one before returned
  for (int logged = 0; logged < kMostEccEvents; ++logged) {
    record.fill(std::byte{0});
    const int error = platform.kernel.sysctlByName("kern.next_ecc_event", record, length);
    if (error != 0) {
      if (error != kNoSuchEntry && error != kBusy) {
        platform.systemLog.message(LogLevel::Default, "Unexpected errno (%d) reading ECC events from kernel",
                                   error);
      }
      return;
    }
    platform.logSubmission.logStructuredData(kEccLogType, eccEventLog(record));
  }
}

void CollectDailyDeviceMetrics(Platform& platform) {
  runStep(platform, "disk usage", [&] { CollectDiskUsage(platform); });
  runStep(platform, "storage telemetry", [&] { DumpStorageStructuredLog(platform, false); });
  runStep(platform, "NAND info", [&] { CollectNANDInfo(platform); });
  runStep(platform, "ECC events", [&] { CollectECCEvents(platform); });
  runStep(platform, "network usage", [&] { CollectDataUsage(platform); });
  runStep(platform, "driver metrics", [&] { CollectDriverMetricScalars(platform); });
}

}  // namespace tbdaily
