// A private copy of the analytics store, for whoever must not touch the device root: even a reader of a
// write-ahead log leaves traces beside it.
#pragma once

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

}  // namespace tbdaily
