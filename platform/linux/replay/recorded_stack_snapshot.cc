#include "platform/linux/replay/recorded_stack_snapshot.h"

namespace tbdaily {

namespace {

class RecordedConfiguration : public StackSnapshotConfiguration {
 public:
  explicit RecordedConfiguration(Recordings& recordings) : recordings_(recordings) {}
  KdStatus setFlags(std::uint64_t) override { return kKdSuccess; }
  KdStatus capture() override {
    captured_ = recordings_.has(recording::kStackSnapshot) &&
                recordings_.readFile(recording::kStackSnapshot, contents_) &&
                contents_.bytes.size() <= UINT32_MAX;
    return captured_ ? kKdSuccess : kKdNotFound;
  }
  std::optional<std::span<const std::byte>> buffer() override {
    if (!captured_) return std::nullopt;
    return contents_.bytes;
  }
  std::uint32_t size() override { return captured_ ? static_cast<std::uint32_t>(contents_.bytes.size()) : 0; }

 private:
  Recordings& recordings_;
  FileContents contents_;
  bool captured_ = false;
};

}  // namespace

std::unique_ptr<StackSnapshotConfiguration> RecordedStackSnapshot::createConfiguration() {
  return std::make_unique<RecordedConfiguration>(recordings_);
}

}  // namespace tbdaily
