// A private copy of the analytics store, for whoever must not touch the device root: even a reader of a
// write-ahead log leaves traces beside it.
#pragma once

#include <memory>

#include "platform/analytics_history.h"
#include "platform/linux/linux_platform.h"
#include "platform/linux/store/store_file.h"
#include "tools/tallyctl/outcome.h"

namespace tbdaily {

struct StoreCopy {
  // Without a name from the beginning: whatever ends the process, nothing of them stays. Not open for a store
  // that is missing.
  FileDescriptor file, log;
};

// Copies the store and its write-ahead log into files of TMPDIR.
Outcome<StoreCopy> copyStore(const StorePlace& store);

// The history of the device's store, read from such a copy. A store that is missing, or has no place, holds
// no rows; one that cannot be used is a failure.
Outcome<std::unique_ptr<OpenAnalyticsHistory>> openHistoryCopy(LinuxPlatform& platform);
inline constexpr const char* kPartOfRows = "the analytics store is damaged: not all of its rows can be read";

}  // namespace tbdaily
