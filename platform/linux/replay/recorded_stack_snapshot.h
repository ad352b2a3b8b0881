// Stack snapshots from a recording, snapshot.kcdata; without one capture fails.
#pragma once

#include "platform/linux/replay/recordings.h"
#include "platform/stack_snapshot.h"

namespace tbdaily {

class RecordedStackSnapshot : public StackSnapshot {
 public:
  explicit RecordedStackSnapshot(Recordings& recordings) : recordings_(recordings) {}
  std::unique_ptr<StackSnapshotConfiguration> createConfiguration() override;

 private:
  Recordings& recordings_;
};

}  // namespace tbdaily
