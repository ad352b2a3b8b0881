#include "platform/linux/replay/recorded_usage_service.h"

#include <algorithm>
#include <chrono>
#include <exception>
#include <string>
#include <utility>

#include "platform/linux/base/host_notes.h"

namespace tbdaily {

class RecordedUsageService::Feed : public UsageFeed {
 public:
  explicit Feed(RecordedUsageService& service) : service_(service) {}
  void requestUsageToDate(std::span<const std::string>, UsageNameKind, UsageReplyHandler handler) override {
    service_.request(std::move(handler));
  }

 private:
  RecordedUsageService& service_;
};

class RecordedUsageService::Workspace : public UsageWorkspace {
 public:
  explicit Workspace(RecordedUsageService& service) : service_(service) {}
  std::unique_ptr<UsageFeed> createFeed() override { return std::make_unique<Feed>(service_); }

 private:
  RecordedUsageService& service_;
};

RecordedUsageService::~RecordedUsageService() {
  {
    const std::lock_guard lock(mutex_);
    ending_ = true;
  }
  ends_.notify_all();
  for (std::thread& delivery : deliveries_) delivery.join();
}

std::unique_ptr<UsageWorkspace> RecordedUsageService::createWorkspace() {
  return std::make_unique<Workspace>(*this);
}

bool RecordedUsageService::waitFor(double seconds) {
  std::unique_lock lock(mutex_);
  return !ends_.wait_for(lock, std::chrono::duration<double>(seconds), [this] { return ending_; });
}

void RecordedUsageService::request(UsageReplyHandler handler) {
  constexpr double kLongestDelay = 1e6;  // seconds; no job lives that long
  PlistValue records = recordings_.entry(recording::kUsage, "records");
  if (records.asArray() == nullptr) return;  // nobody answers
  const auto delay = recordings_.entry(recording::kUsage, "delay").asNumber();
  // A delay that is not a number compares false and counts as none.
  const double seconds = delay && delay->toDouble() > 0 ? std::min(delay->toDouble(), kLongestDelay) : 0;
  const std::lock_guard lock(mutex_);
  deliveries_.emplace_back([this, seconds, records = std::move(records), handler = std::move(handler)] {
    if (!waitFor(seconds)) return;
    try {
      handler(records);
    } catch (const std::exception& failure) {
      noteOnce(std::string("a usage reply was not processed: ") + failure.what());
    }
  });
}

}  // namespace tbdaily
