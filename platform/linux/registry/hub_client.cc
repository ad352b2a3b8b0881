#include "platform/linux/registry/hub_client.h"

#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <utility>

#include "platform/byte_reader.h"
#include "platform/byte_writer.h"
#include "platform/linux/base/file_io.h"

namespace tbdaily {

namespace {

enum HubMethod : std::uint32_t { kOpen = 0, kConfigure = 2, kUpdate = 3 };

constexpr std::size_t kInterestsFrom = 8;
constexpr std::size_t kInterestSize = 24;

constexpr std::size_t kElementBytes = HubRoom::kElementBytes;
constexpr std::size_t kMostElements = (std::size_t{1} << 30) / kElementBytes;

// Wider than the memory type, so that a client which mixes them up is found out.
constexpr std::uint64_t kBufferIdentifier = 0x6B64'0000'0000'0035;
constexpr auto kMemoryType = static_cast<std::uint32_t>(kBufferIdentifier);

// One mapping of the buffer into the process.
class Mapping {
 public:
  // Empty when the system refuses, or of no bytes.
  Mapping(const FileDescriptor& memory, std::size_t length) {
    if (length == 0) return;
    void* address = ::mmap(nullptr, length, PROT_READ | PROT_WRITE, MAP_SHARED, memory.get(), 0);
    if (address != MAP_FAILED) bytes_ = {static_cast<std::byte*>(address), length};
  }
  Mapping(Mapping&& other) noexcept : bytes_(std::exchange(other.bytes_, {})) {}
  Mapping& operator=(Mapping&& other) noexcept {
    std::swap(bytes_, other.bytes_);
    return *this;
  }
  ~Mapping() {
    if (!bytes_.empty()) ::munmap(bytes_.data(), bytes_.size());
  }

  std::span<std::byte> bytes() const { return bytes_; }

 private:
  std::span<std::byte> bytes_;
};

// The shared memory: the hub's own mapping and those that it gave to the client. Without elements it takes
// no memory at all.
class SharedBuffer {
 public:
  // False when the system has no memory for it.
  bool allocate(std::size_t length) {
    if (length == 0) return true;
    memory_ = FileDescriptor(::memfd_create("driver-metrics-hub", MFD_CLOEXEC));
    if (!memory_.isOpen() || ::ftruncate(memory_.get(), static_cast<off_t>(length)) != 0) return false;
    own_ = Mapping(memory_, length);
    return !own_.bytes().empty();
  }

  std::span<std::byte> bytes() const { return own_.bytes(); }

  KdStatus map(std::span<std::byte>& mapped) {
    Mapping mapping(memory_, bytes().size());
    if (mapping.bytes().size() != bytes().size()) return kKdNoMemory;
    mapped = mapping.bytes();
    given_.push_back(std::move(mapping));
    return kKdSuccess;
  }

  KdStatus unmap(std::span<std::byte> mapped) {
    const auto found = std::find_if(given_.begin(), given_.end(), [mapped](const Mapping& mapping) {
      return mapping.bytes().data() == mapped.data() && mapping.bytes().size() == mapped.size();
    });
    if (found == given_.end()) return kKdBadArgument;
    given_.erase(found);
    return kKdSuccess;
  }

 private:
  FileDescriptor memory_;
  Mapping own_{memory_, 0};
  std::vector<Mapping> given_;
};

class HubClient : public UserClient {
 public:
  HubClient(const HubStatuses& statuses, std::unique_ptr<HubValues> values)
      : statuses_(statuses), values_(std::move(values)) {}

  KdStatus callScalar(std::uint32_t method, std::span<const std::uint64_t>, std::span<std::uint64_t>,
                      std::size_t& outputCount) override {
    outputCount = 0;
    if (method != kOpen) return kKdBadArgument;
    isOpen_ = statuses_.open == kKdSuccess;
    return statuses_.open;
  }

  KdStatus call(std::uint32_t method, const KdMethodInput& input, KdMethodOutput& output) override {
    output.scalarCount = 0;
    output.structureSize = 0;
    if (method == kConfigure) return configure(input, output);
    return method == kUpdate ? update(input) : kKdBadArgument;
  }

  KdStatus mapMemory(std::uint32_t memoryType, std::span<std::byte>& memory) override {
    if (!isConfigured_ || memoryType != kMemoryType) return kKdBadArgument;
    return statuses_.map == kKdSuccess ? buffer_.map(memory) : statuses_.map;
  }

  KdStatus unmapMemory(std::uint32_t memoryType, std::span<std::byte> memory) override {
    return memoryType == kMemoryType ? buffer_.unmap(memory) : kKdBadArgument;
  }

 private:
  KdStatus configure(const KdMethodInput& input, KdMethodOutput& output) {
    const ByteReader list(input.structure);
    const auto count = list.at<std::uint32_t>(0);
    const bool isWellFormed =
        count && input.structure.size() == kInterestsFrom + std::uint64_t{*count} * kInterestSize;
    if (!isOpen_ || isConfigured_ || !isWellFormed || output.scalars.empty()) return kKdBadArgument;
    if (statuses_.configure != kKdSuccess) return statuses_.configure;

    std::vector<ChannelKey> interests;
    for (std::size_t at = kInterestsFrom; at < input.structure.size(); at += kInterestSize)
      interests.push_back({*list.at<std::uint64_t>(at), *list.at<std::uint64_t>(at + 8)});
    std::vector<std::size_t> elements = values_->configure(interests);
    std::size_t all = 0;
    for (const std::size_t own : elements) {
      if (own > kMostElements - all) return kKdNoMemory;
      all += own;
    }
    SharedBuffer buffer;
    if (!buffer.allocate(all * kElementBytes)) return kKdNoMemory;
    buffer_ = std::move(buffer);
    elements_ = std::move(elements);
    isConfigured_ = true;
    writeValues();
    output.scalars[0] = kBufferIdentifier;
    output.scalarCount = 1;
    return kKdSuccess;
  }

  KdStatus update(const KdMethodInput& input) {
    if (!isConfigured_ || input.scalars.size() != 1 || input.scalars[0] != kBufferIdentifier)
      return kKdBadArgument;
    if (statuses_.update == kKdSuccess) writeValues();
    return statuses_.update;
  }

  void writeValues() {
    values_->update();
    std::span<std::byte> rest = buffer_.bytes();
    for (std::size_t interest = 0; interest < elements_.size(); ++interest) {
      const std::span<std::byte> room = rest.first(elements_[interest] * kElementBytes);
      rest = rest.subspan(room.size());
      if (!room.empty()) values_->write(interest, HubRoom(room));
    }
  }

  const HubStatuses statuses_;
  const std::unique_ptr<HubValues> values_;
  bool isOpen_ = false;
  bool isConfigured_ = false;
  SharedBuffer buffer_;
  std::vector<std::size_t> elements_;  // of each interest
};

}  // namespace

void HubRoom::write(std::size_t element, const ChannelKey& key, std::uint64_t type, std::uint64_t stamp,
                    std::span<const std::uint64_t, kWords> words) const {
  std::span<std::byte> rest = bytes_.subspan(element * kElementBytes, kElementBytes);
  const auto put = [&rest](std::uint64_t number) {
    writeLittleEndian(rest.first(sizeof number), number);
    rest = rest.subspan(sizeof number);
  };
  for (const std::uint64_t number : {key.driver, key.channel, type, stamp}) put(number);
  for (const std::uint64_t word : words) put(word);
}

std::unique_ptr<UserClient> makeHubClient(const HubStatuses& statuses, std::unique_ptr<HubValues> values) {
  return std::make_unique<HubClient>(statuses, std::move(values));
}

}  // namespace tbdaily
