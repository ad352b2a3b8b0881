// Fakes of the families that reach into the kernel: driver registry, stack snapshots, network usage. Each
// answers as an absent service until it is scripted.
#pragma once

#include <latch>
#include <memory>
#include <optional>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "platform/stack_snapshot.h"
#include "platform/usage_service.h"
#include "testing/fake_driver_registry.h"

namespace tbdaily::testing {

class FakeStackSnapshot : public StackSnapshot {
 public:
  std::optional<std::vector<std::byte>> bytes;  // none: the facility is absent
  bool givesBuffer = true;                      // after a successful capture
  KdStatus flagsStatus = kKdSuccess, captureStatus = kKdSuccess;
  std::vector<std::uint64_t> flags;
  int configurations = 0;  // that were not released

  std::unique_ptr<StackSnapshotConfiguration> createConfiguration() override {
    return bytes ? std::make_unique<Configuration>(*this) : nullptr;
  }

 private:
  struct Configuration : StackSnapshotConfiguration {
    explicit Configuration(FakeStackSnapshot& snapshot) : fake(snapshot) { ++fake.configurations; }
    ~Configuration() override { --fake.configurations; }
    KdStatus setFlags(std::uint64_t word) override {
      fake.flags.push_back(word);
      return fake.flagsStatus;
    }
    KdStatus capture() override {
      isCaptured = fake.captureStatus == kKdSuccess;
      return fake.captureStatus;
    }
    std::optional<std::span<const std::byte>> buffer() override {
      if (!isCaptured || !fake.givesBuffer) return std::nullopt;
      return std::span<const std::byte>(*fake.bytes);
    }
    std::uint32_t size() override { return isCaptured ? static_cast<std::uint32_t>(fake.bytes->size()) : 0; }

    FakeStackSnapshot& fake;
    bool isCaptured = false;
  };
};

class FakeUsageService : public UsageService {
 public:
  PlistValue records;   // none: the reply never comes
  bool isLate = false;  // replies come when they are waited for, and no earlier

  std::unique_ptr<UsageWorkspace> createWorkspace() override { return std::make_unique<Source>(*this); }
  ~FakeUsageService() override { waitForReplies(); }
  void waitForReplies() {
    for (const auto& release : held_) release->count_down();
    held_.clear();
    replies_.clear();
  }

 private:
  struct Source : UsageWorkspace, UsageFeed {
    explicit Source(FakeUsageService& service) : fake(service) {}
    std::unique_ptr<UsageFeed> createFeed() override { return std::make_unique<Source>(fake); }
    void requestUsageToDate(std::span<const std::string>, UsageNameKind, UsageReplyHandler handler) override {
      if (fake.records.isNone()) return;
      const auto release = std::make_shared<std::latch>(fake.isLate ? 1 : 0);
      if (fake.isLate) fake.held_.push_back(release);
      fake.replies_.emplace_back([handler = std::move(handler), records = fake.records, release] {
        release->wait();
        handler(records);
      });
    }
    FakeUsageService& fake;
  };

  std::vector<std::shared_ptr<std::latch>> held_;
  std::vector<std::jthread> replies_;  // ended before the rest goes
};

}  // namespace tbdaily::testing
