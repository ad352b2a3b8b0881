// The usage service on a recording: usage.plist holds what it answers, and after how long.
#pragma once

#include <condition_variable>
#include <memory>
#include <mutex>
#include <thread>
#include <vector>

#include "platform/linux/replay/recordings.h"
#include "platform/usage_service.h"

namespace tbdaily {

// Each reply is delivered on a thread of its own. The destructor gives up replies that are still to come and
// waits for one that is being processed, so that nothing is left half done and nothing runs afterwards. Feeds
// do not outlive the service.
class RecordedUsageService : public UsageService {
 public:
  explicit RecordedUsageService(Recordings& recordings) : recordings_(recordings) {}
  ~RecordedUsageService() override;

  std::unique_ptr<UsageWorkspace> createWorkspace() override;

 private:
  class Feed;
  class Workspace;

  void request(UsageReplyHandler handler);
  // Sleeps; answers false when the service ends first.
  bool waitFor(double seconds);

  Recordings& recordings_;
  std::mutex mutex_;
  std::condition_variable ends_;
  bool ending_ = false;
  std::vector<std::thread> deliveries_;
};

}  // namespace tbdaily
