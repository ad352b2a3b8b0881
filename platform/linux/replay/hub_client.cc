// The driver metrics hub of a recording: takes a list of interests once, lays out a buffer that it shares
// with the client, and writes the values of hub.plist into it each time it is asked.

#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <unordered_map>
#include <utility>
#include <vector>

#include "platform/byte_reader.h"
#include "platform/byte_writer.h"
#include "platform/identifier_hash.h"
#include "platform/linux/base/file_io.h"
#include "platform/linux/replay/recorded_client.h"

namespace tbdaily {

namespace {

enum HubMethod : std::uint32_t { kOpen = 0, kConfigure = 2, kUpdate = 3 };

constexpr std::size_t kInterestsFrom = 8;
constexpr std::size_t kInterestSize = 24;

// An element of the shared buffer: driver, channel, type, stamp and four values, each of 8 bytes.
constexpr std::size_t kElementNumbers = 8;
constexpr std::size_t kElementBytes = kElementNumbers * 8;
constexpr std::size_t kStamp = 3;
constexpr std::size_t kWordsFrom = 4;
constexpr std::size_t kMostElements = (std::size_t{1} << 30) / kElementBytes;

// Wider than the memory type, so that a client which mixes them up is found out.
constexpr std::uint64_t kBufferIdentifier = 0x6B64'0000'0000'0035;
constexpr auto kMemoryType = static_cast<std::uint32_t>(kBufferIdentifier);

struct ChannelKey {
  std::uint64_t driver = 0, channel = 0;
  friend bool operator==(const ChannelKey&, const ChannelKey&) = default;
};

struct ChannelKeyHash {
  std::size_t operator()(const ChannelKey& key) const { return identifierHash(key.driver, key.channel); }

 private:
  IdentifierHash identifierHash;
};

std::uint64_t integerOrZero(const PlistDictionary& dictionary, std::string_view key) {
  const PlistValue* value = dictionary.find(key);
  return static_cast<std::uint64_t>(value != nullptr ? value->asInteger().value_or(0) : 0);
}

// The channels of hub.plist as they are now; of two with the same identifiers the first counts.
class RecordedChannels {
 public:
  explicit RecordedChannels(Recordings& recordings)
      : channels_(recordings.entry(recording::kHub, "channels")) {
    if (channels_.asArray() == nullptr) return;
    byKey_.reserve(channels_.asArray()->size());
    for (const PlistValue& element : *channels_.asArray()) {
      const PlistDictionary* channel = element.asDictionary();
      if (channel == nullptr) continue;
      const auto driverID = channel->get("driver").asInteger(),
                 channelID = channel->get("channel").asInteger();
      if (!driverID || !channelID) continue;
      byKey_.emplace(
          ChannelKey{static_cast<std::uint64_t>(*driverID), static_cast<std::uint64_t>(*channelID)}, channel);
    }
  }

  // Null when it is not there. Borrowed from this object.
  const PlistDictionary* find(const ChannelKey& key) const {
    const auto found = byKey_.find(key);
    return found != byKey_.end() ? found->second : nullptr;
  }

 private:
  PlistValue channels_;
  std::unordered_map<ChannelKey, const PlistDictionary*, ChannelKeyHash> byKey_;
};

// The elements of a channel; null when it has none.
const PlistArray* elementsOf(const PlistDictionary* channel) {
  const PlistValue* elements = channel != nullptr ? channel->find("elements") : nullptr;
  return elements != nullptr ? elements->asArray() : nullptr;
}

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

void putElement(std::span<std::byte, kElementBytes> out,
                const std::array<std::uint64_t, kElementNumbers>& numbers) {
  for (std::size_t i = 0; i < kElementNumbers; ++i)
    writeLittleEndian(out.subspan(i * sizeof(std::uint64_t), sizeof(std::uint64_t)), numbers[i]);
}

class HubClient : public RecordedClient {
 public:
  HubClient(const PlistDictionary& client, Recordings& recordings)
      : openStatus_(recordedStatus(client, "userClientOpenStatus")),
        configureStatus_(recordedStatus(client, "configureStatus")),
        mapStatus_(recordedStatus(client, "mapStatus")),
        updateStatus_(recordedStatus(client, "updateStatus")),
        recordings_(recordings) {}

  KdStatus callScalar(std::uint32_t method, std::span<const std::uint64_t>, std::span<std::uint64_t>,
                      std::size_t& outputCount) override {
    outputCount = 0;
    if (method != kOpen) return kKdBadArgument;
    isOpen_ = openStatus_ == kKdSuccess;
    return openStatus_;
  }

  KdStatus call(std::uint32_t method, const KdMethodInput& input, KdMethodOutput& output) override {
    output.scalarCount = 0;
    output.structureSize = 0;
    if (method == kConfigure) return configure(input, output);
    return method == kUpdate ? update(input) : kKdBadArgument;
  }

  KdStatus mapMemory(std::uint32_t memoryType, std::span<std::byte>& memory) override {
    if (!isConfigured_ || memoryType != kMemoryType) return kKdBadArgument;
    return mapStatus_ == kKdSuccess ? buffer_.map(memory) : mapStatus_;
  }

  KdStatus unmapMemory(std::uint32_t memoryType, std::span<std::byte> memory) override {
    return memoryType == kMemoryType ? buffer_.unmap(memory) : kKdBadArgument;
  }

 private:
  // The place of one interest's elements in the buffer.
  struct Place {
    ChannelKey key;
    std::size_t elements = 0;
  };

  KdStatus configure(const KdMethodInput& input, KdMethodOutput& output) {
    const ByteReader list(input.structure);
    const auto count = list.at<std::uint32_t>(0);
    const bool isWellFormed =
        count && input.structure.size() == kInterestsFrom + std::uint64_t{*count} * kInterestSize;
    if (!isOpen_ || isConfigured_ || !isWellFormed || output.scalars.empty()) return kKdBadArgument;
    if (configureStatus_ != kKdSuccess) return configureStatus_;

    const RecordedChannels channels(recordings_);
    std::vector<Place> places;
    std::size_t elements = 0;
    for (std::size_t at = kInterestsFrom; at < input.structure.size(); at += kInterestSize) {
      const ChannelKey key{*list.at<std::uint64_t>(at), *list.at<std::uint64_t>(at + 8)};
      const PlistArray* recorded = elementsOf(channels.find(key));
      if (recorded == nullptr || recorded->empty()) continue;
      if (recorded->size() > kMostElements - elements) return kKdNoMemory;
      elements += recorded->size();
      places.push_back({key, recorded->size()});
    }
    SharedBuffer buffer;
    if (!buffer.allocate(elements * kElementBytes)) return kKdNoMemory;
    buffer_ = std::move(buffer);
    places_ = std::move(places);
    isConfigured_ = true;
    writeValues(channels);
    output.scalars[0] = kBufferIdentifier;
    output.scalarCount = 1;
    return kKdSuccess;
  }

  KdStatus update(const KdMethodInput& input) {
    if (!isConfigured_ || input.scalars.size() != 1 || input.scalars[0] != kBufferIdentifier)
      return kKdBadArgument;
    if (updateStatus_ == kKdSuccess) writeValues(RecordedChannels(recordings_));
    return updateStatus_;
  }

  // What the recording no longer has keeps its values; what it has beyond the layout is left out.
  void writeValues(const RecordedChannels& channels) const {
    std::span<std::byte> rest = buffer_.bytes();
    for (const Place& place : places_) {
      const std::span<std::byte> room = rest.first(place.elements * kElementBytes);
      rest = rest.subspan(room.size());
      if (const PlistDictionary* channel = channels.find(place.key); channel != nullptr)
        writeChannel(*channel, place.key, room);
    }
  }

  static void writeChannel(const PlistDictionary& channel, const ChannelKey& key, std::span<std::byte> room) {
    const PlistArray* elements = elementsOf(&channel);
    if (elements == nullptr) return;
    std::array<std::uint64_t, kElementNumbers> numbers{key.driver, key.channel,
                                                       integerOrZero(channel, "type")};
    const std::size_t count = std::min(elements->size(), room.size() / kElementBytes);
    for (std::size_t i = 0; i < count; ++i) {
      fillFromElement((*elements)[i], numbers);
      putElement(room.subspan(i * kElementBytes).first<kElementBytes>(), numbers);
    }
  }

  static void fillFromElement(const PlistValue& value, std::array<std::uint64_t, kElementNumbers>& numbers) {
    std::fill(numbers.begin() + kStamp, numbers.end(), 0);
    numbers[kStamp] = static_cast<std::uint64_t>(value.get("stamp").asInteger().value_or(0));
    const PlistValue recorded = value.get("words");
    const PlistArray* words = recorded.asArray();
    if (words == nullptr) return;
    for (std::size_t i = 0; i < words->size() && kWordsFrom + i < kElementNumbers; ++i)
      numbers[kWordsFrom + i] = static_cast<std::uint64_t>((*words)[i].asInteger().value_or(0));
  }

  const KdStatus openStatus_, configureStatus_, mapStatus_, updateStatus_;
  Recordings& recordings_;
  bool isOpen_ = false;
  bool isConfigured_ = false;
  SharedBuffer buffer_;
  std::vector<Place> places_;
};

}  // namespace

std::unique_ptr<RecordedClient> makeHubClient(const PlistDictionary& client, Recordings& recordings) {
  return std::make_unique<HubClient>(client, recordings);
}

}  // namespace tbdaily
