// The driver registry of a recording, registry.plist: its entries, and user clients that answer as they were
// recorded. Without the recording everything answers as absent.
#pragma once

#include <memory>

#include "platform/linux/registry/entry_registry.h"
#include "platform/linux/replay/recordings.h"

namespace tbdaily {

class RecordedDriverRegistry : public EntryRegistry {
 public:
  explicit RecordedDriverRegistry(Recordings& recordings) : recordings_(recordings) {}

 protected:
  PlistValue currentEntries() override;
  std::unique_ptr<UserClient> makeClient(const PlistDictionary& client) override;

 private:
  Recordings& recordings_;
};

}  // namespace tbdaily
