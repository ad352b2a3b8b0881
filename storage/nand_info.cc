#include "storage/nand_info.h"

#include <new>
#include <utility>

#include "platform/preferences_store.h"
#include "storage/nand_key_map.h"
#include "storage/storage_connection.h"

namespace tbdaily {

namespace {

constexpr std::string_view kExportVersionKey = "com.velmora.NANDInfo.ExportVersion";
constexpr std::string_view kDriverVersionKey = "com.velmora.NANDInfo.DriverVersion";
constexpr std::string_view kDemoModeKey = "com.velmora.NANDInfo.DemoMode";
constexpr std::string_view kDemoModePreference = "StoreDemoMode";
constexpr std::string_view kNumSleepOpsKey = "com.velmora.NANDInfo.NumSleepOps";
constexpr std::string_view kEnduranceErasesKey = "com.velmora.NANDInfo.HighEnduranceBlockEraseCount";
constexpr std::string_view kBlocksPerVirtualBlockKey = "com.velmora.NANDInfo.BlocksPerVirtualBlock";
constexpr std::string_view kIntermediateSizeKey = "com.velmora.NANDInfo.IntermediatePartitionSize";
constexpr std::string_view kMaintenanceKey = "com.velmora.NANDInfo.NumMaintenanceRequests";
constexpr std::string_view kFailedReadKey = "com.velmora.NANDInfo.MaintenanceRequestsFailedRead";
constexpr std::string_view kFailedProgKey = "com.velmora.NANDInfo.MaintenanceRequestsFailedProg";
constexpr std::string_view kFailedEraseKey = "com.velmora.NANDInfo.MaintenanceRequestsFailedErase";

// From this export version on a buffer has more than the base entries.
constexpr std::uint32_t kFullExportVersion = 0x20002;
constexpr std::uint64_t kStartOf2000 = 946684800;  // seconds since 1970-01-01 UTC
constexpr std::uint64_t kSecondsPerWeek = 604800;
constexpr std::uint64_t kNotSeen = 0xFFFFFFFF;

struct NarrowEntry {
  std::string_view key;
  std::uint32_t StatsContext::*field;
};
struct WideEntry {
  std::string_view key;
  std::uint64_t StatsContext::*field;
};

constexpr std::array<NarrowEntry, 3> kNarrowBaseEntries = {{
    {"com.velmora.NANDInfo.NumVirtualBlocks", &StatsContext::numVirtualBlocks},
    {"com.velmora.NANDInfo.PagesPerVirtualBlock", &StatsContext::pagesPerVirtualBlock},
    {"com.velmora.NANDInfo.BytesPerPage", &StatsContext::bytesPerPage},
}};
constexpr std::array<WideEntry, 9> kWideBaseEntries = {{
    {"com.velmora.NANDInfo.NumLogicalReads", &StatsContext::hostReads},
    {"com.velmora.NANDInfo.NumLogicalWrites", &StatsContext::hostWrites},
    {"com.velmora.NANDInfo.NumFreeVirtualBlocks", &StatsContext::numFreeVirtualBlocks},
    {"com.velmora.NANDInfo.NumWearLevelOps", &StatsContext::wearLevMoves},
    {"com.velmora.NANDInfo.NumPhysicalReads", &StatsContext::nandReads},
    {"com.velmora.NANDInfo.NumPhysicalWrites", &StatsContext::nandWrites},
    {"com.velmora.NANDInfo.NumPhysicalErases", &StatsContext::bandErases},
    {"com.velmora.NANDInfo.NodesFree", &StatsContext::IND_pool_free},
    {"com.velmora.NANDInfo.NodesTotal", &StatsContext::IND_pool_count},
}};

PlistDictionary errorInfo(const char* message) {
  return {{std::string(kNANDInfoErrorKey), PlistValue::string("1")},
          {std::string(kNANDInfoErrorMessageKey), PlistValue::string(message)}};
}

std::uint64_t weeksSince2000(std::uint64_t time) {
  return time <= kStartOf2000 ? 0 : (time - kStartOf2000) / kSecondsPerWeek;
}

// The low 32 bits with three significant digits kept, rounded half up.
std::uint64_t threeSignificantDigits(std::uint64_t value) {
  const std::uint64_t x = static_cast<std::uint32_t>(value);
  std::uint64_t unit = 1;
  while (x / unit >= 1000) unit *= 10;
  const std::uint64_t kept = x / unit;
  const bool roundsUp = unit > 1 && x % unit >= unit / 2;
  return (roundsUp ? kept + 1 : kept) * unit;
}

// Fills one dictionary from one context.
class NandInfoBuilder {
 public:
  NandInfoBuilder(const StatsContext& context, Diagnostics& diagnostics)
      : context_(context), diagnostics_(diagnostics) {}

  void addVersionsAndDemoMode(PreferencesStore& preferences) {
    add32(kExportVersionKey, context_.exportVersion);
    add32(kDriverVersionKey, context_.driverVersion);
    const PreferenceBoolean demo =
        preferences.getApplicationBoolean(kDemoModePreference, preference_domain::kDemoSettings);
    add64(kDemoModeKey, demo.valid && demo.value ? 1 : 0);
  }

  void addBaseEntries() {
    for (const auto& [key, field] : kNarrowBaseEntries) add32(key, context_.*field);
    for (const auto& [key, field] : kWideBaseEntries) add64(key, context_.*field);
  }

  void addFullEntries() {
    add64(kNANDInfoFormatWeeksSince2000Key, weeksSince2000(context_.utilFormatTime));
    add64(kNumSleepOpsKey, context_.numSleepOps);
    add64(kEnduranceErasesKey, context_.maxHighEnduranceBlockErases);
    add32(kBlocksPerVirtualBlockKey, context_.blocksPerVirtualBlock);
    for (std::size_t i = 0; i < context_.readCountHisto.size(); ++i)
      add64(kNANDInfoReadsBeforeErasureKeys[i], context_.readCountHisto[i]);
    for (const StatNode& node : context_.nodes) addListed(node);
    if (userStart_ != kNotSeen && intermediateStart_ != kNotSeen)
      add64(kIntermediateSizeKey, userStart_ - intermediateStart_);
    add64(kMaintenanceKey, maintenance_);
    add64(kFailedReadKey, failedRead_);
    add64(kFailedProgKey, failedProg_);
    add64(kFailedEraseKey, failedErase_);
  }

  PlistDictionary take() { return std::move(info_); }

 private:
  void add32(std::string_view key, std::uint32_t value) {
    SetNumberValue(info_, key, PlistNumber::int32(static_cast<std::int32_t>(value)), diagnostics_);
  }
  void add64(std::string_view key, std::uint64_t value) {
    SetNumberValue(info_, key, PlistNumber::int64(static_cast<std::int64_t>(value)), diagnostics_);
  }

  void addListed(const StatNode& node) {
    const NandInfoTarget target = nandInfoTarget(node);
    const std::uint64_t one = node.value != 0 ? 1 : 0;
    switch (target.rule) {
      case NandInfoRule::Ignored:
        break;
      case NandInfoRule::UserPartitionStart:
        userStart_ = node.value;
        break;
      case NandInfoRule::IntermediatePartitionStart:
        intermediateStart_ = node.value;
        break;
      case NandInfoRule::Maintenance:
        maintenance_ += node.value;
        break;
      case NandInfoRule::FailedRead:
        failedRead_ += one;
        break;
      case NandInfoRule::FailedProg:
        failedProg_ += one;
        break;
      case NandInfoRule::FailedErase:
        failedErase_ += one;
        break;
      case NandInfoRule::Key:
        add64(target.key, node.value);
        break;
      case NandInfoRule::KeyOfThreeDigits:
        add64(target.key, threeSignificantDigits(node.value));
        break;
    }
  }

  const StatsContext& context_;
  Diagnostics& diagnostics_;
  PlistDictionary info_;
  std::uint64_t userStart_ = kNotSeen;
  std::uint64_t intermediateStart_ = kNotSeen;
  std::uint64_t maintenance_ = 0;
  std::uint64_t failedRead_ = 0;
  std::uint64_t failedProg_ = 0;
  std::uint64_t failedErase_ = 0;
};

}  // namespace

PlistDictionary CopyNANDInfo(Platform& platform) {
  const FetchedStats stats(platform.driverRegistry, platform.diagnostics);
  if (!stats) return errorInfo("Unable to parse buffer");
  return NandInfoFromContext(platform.preferences, stats.context(), false, platform.diagnostics)
      .value_or(PlistDictionary());
}

std::optional<PlistDictionary> NandInfoFromContext(PreferencesStore& preferences, const StatsContext& context,
                                                   bool logVariant, Diagnostics& diagnostics) {
  if (context.exportVersion == 0) {
    if (logVariant) return std::nullopt;
    return errorInfo("Unsupported export version");
  }
  NandInfoBuilder builder(context, diagnostics);
  if (!logVariant) builder.addVersionsAndDemoMode(preferences);
  builder.addBaseEntries();
  if (context.exportVersion >= kFullExportVersion) builder.addFullEntries();
  return builder.take();
}

void DumpNANDInfo(Platform& platform, PlistDictionary& target) {
  const FetchedStats stats(platform.driverRegistry, platform.diagnostics);
  if (!stats) return;
  const auto info = NandInfoFromContext(platform.preferences, stats.context(), true, platform.diagnostics);
  if (!info) return;
  for (const auto& [key, value] : *info) CopyDictionary(key, value, target);
}

void CopyDictionary(std::string_view key, const PlistValue& value, PlistDictionary& target) {
  target.set(key, value);
}

void SetNumberValue(PlistDictionary& dictionary, std::string_view key, const PlistNumber& value,
                    Diagnostics& diagnostics) {
  try {
    dictionary.set(key, PlistValue(value));
  } catch (const std::bad_alloc&) {
    diagnostics.error("Failed to create PVNumber from value: %p", static_cast<const void*>(&value));
  }
}

}  // namespace tbdaily
