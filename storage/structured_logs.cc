#include "storage/structured_logs.h"

#include <array>
#include <memory>
#include <new>

#include "platform/preferences_store.h"
#include "storage/storage_connection.h"
#include "storage/write_amplification.h"

namespace tbdaily {

StorageLogState gStorageLogState;

namespace {

using ListHandler = bool (*)(Platform&, const FetchedList&);

// Lists that are fetched, and what handles them. `unsupported` is said, once, when the controller cannot
// serve them.
struct ListKind {
  SelectorGetter NandExporter::*getter;
  ListHandler handler;
  std::uint16_t lists;  // how many sub-lists
  const char* unsupported;
};

constexpr std::array<ListKind, 3> kListKinds = {{
    {&NandExporter::bandStatsSelectors, HandleValidityList, 1, "Validity list"},
    {&NandExporter::telemetryListSelectors, HandleTelemetryList, 3, "Telemetry list"},
    {&NandExporter::defectsListSelectors, HandleDefectsList, 1, "Defects list"},
}};

// Zeros when the statistics cannot be had.
WriteAmplification currentWriteAmplification(Platform& platform) {
  try {
    const auto stats = std::make_unique<FetchedStats>(platform.driverRegistry, platform.diagnostics);
    return *stats ? computeWriteAmplification(stats->context()) : WriteAmplification{};
  } catch (const std::bad_alloc&) {
    platform.diagnostics.error("not enough memory?");
    return {};
  }
}

void updateState(Platform& platform) {
  StorageLogState& state = gStorageLogState;
  const WriteAmplification amplification = currentWriteAmplification(platform);
  state.gCurrentUserWamp = amplification.user;
  state.gCurrentSysWamp = amplification.system;
  state.gNeedValidityList =
      state.gForceCollectionSet || isAboveThreshold(amplification.user, platform.preferences);
}

constexpr std::size_t kMostEntries = [] {
  std::size_t entries = 0;
  for (const ListKind& kind : kListKinds) entries += kind.lists;
  return entries;
}();

// The lists of one open controller.
class ListCollection {
 public:
  ListCollection(Platform& platform, const StorageService& service, const StorageConnection& connection,
                 PlistValue characteristics, bool extended)
      : platform_(platform),
        descriptor_(service.descriptor()),
        connection_(connection),
        characteristics_(std::move(characteristics)),
        extended_(extended) {}

  bool run() {
    std::array<SelectorFunctionEntry, kMostEntries> entries;
    std::size_t count = 0;
    for (const ListKind& kind : kListKinds) {
      const SelectorGetter getter = descriptor_.*kind.getter;
      if (getter == nullptr) {
        platform_.diagnostics.error("%s retrieval is not supported\n", kind.unsupported);
        continue;
      }
      for (std::uint16_t list = 0; list < kind.lists; ++list) entries[count++] = {getter, kind.handler, list};
    }
    bool result = true;
    for (std::size_t i = 0; i < count; ++i) result = collect(entries[i], static_cast<int>(i)) && result;
    return result;
  }

 private:
  struct SelectorFunctionEntry {
    SelectorGetter getter;
    ListHandler handler;
    std::uint16_t list;
  };

  // False when the list makes the whole result false, memory that runs out included; a query or a fetch that
  // fails does not. The other lists are collected all the same.
  bool collect(const SelectorFunctionEntry& entry, int index) {
    try {
      return fetchAndHandle(entry, index);
    } catch (const std::bad_alloc&) {
      return false;
    }
  }

  bool fetchAndHandle(const SelectorFunctionEntry& entry, int index) {
    const STXSelectorPair* selectors = entry.getter();
    if (selectors == nullptr) return false;
    const StxRequestOptions options{entry.list, extended_};
    const StxRequest query = StxRequest::sizeQuery(*selectors, options);
    std::uint32_t size = 0;
    if (const KdStatus status = connection_.querySize(&query, size); status != kKdSuccess) {
      platform_.diagnostics.error("KdConnectCallStructMethod failed with status 0x%x on selector index %d\n",
                                  static_cast<unsigned>(status), index);
      return true;
    }
    if (size == 0) return true;
    StorageBuffer buffer(size);
    if (!buffer) {
      platform_.diagnostics.error("Could not malloc %zd bytes", static_cast<ssize_t>(size));
      return false;
    }
    const StxRequest fetch = StxRequest::dataFetch(*selectors, options);
    if (connection_.fetch(&fetch, buffer) != kKdSuccess) {
      platform_.diagnostics.error("Could not retrieve data from driver for selector %u\n", fetch.command);
      return true;
    }
    return entry.handler(platform_, {buffer.filled(), size, characteristics_, descriptor_.className});
  }

  Platform& platform_;
  const NandExporter& descriptor_;
  const StorageConnection& connection_;
  const PlistValue characteristics_;
  const bool extended_;
};

}  // namespace

bool DumpStorageStructuredLog(Platform& platform, bool extended) {
  Diagnostics& diagnostics = platform.diagnostics;
  updateState(platform);
  const StorageService service(platform.driverRegistry);
  if (!service) {
    diagnostics.error("Could not get matching KdKit service for exporting classes\n");
    return false;
  }
  const StorageConnection connection(service, diagnostics);
  if (!connection) return false;
  PlistValue characteristics = platform.driverRegistry.KdRegistryEntrySearchCFProperty(
      service.handle(), KdRegistryPlane::KdService, service.descriptor().characteristicsKey,
      KdSearchOptions::RecursivelyTowardsParents);
  if (characteristics.isNone()) {
    diagnostics.error("failed to create dictionary");
    return false;
  }
  return ListCollection(platform, service, connection, std::move(characteristics), extended).run();
}

}  // namespace tbdaily
