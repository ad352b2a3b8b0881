// The storage controller of a recording: numbered buffers behind size queries and fetches, told apart by
// method, command code, sub-list and the size-query flag.

#include <algorithm>

#include "platform/byte_reader.h"
#include "platform/byte_writer.h"
#include "platform/linux/registry/entry_registry.h"
#include "platform/linux/replay/recorded_clients.h"

namespace tbdaily {

namespace {

constexpr std::size_t kRequestSize = 24;
constexpr std::size_t kReservedFrom = 6;
constexpr std::size_t kSizeAnswer = 4;
constexpr unsigned kSizeQueryFlag = 1U;
constexpr unsigned kListShift = 2;
constexpr unsigned kListMask = 0xFF;
constexpr unsigned kReservedFlags = 0xFC00;

struct Request {
  std::optional<std::int64_t> code;  // nothing: a request without an input structure
  std::int64_t list = 0;
  bool isSizeQuery = false;
};

// Nothing when a strict driver would not take it.
std::optional<Request> parseRequest(std::span<const std::byte> input) {
  if (input.empty()) return Request{};
  if (input.size() != kRequestSize) return std::nullopt;
  const bool reservedIsZero =
      std::all_of(input.begin() + kReservedFrom, input.end(), [](std::byte b) { return b == std::byte{0}; });
  const ByteReader reader(input);
  const unsigned flags = *reader.at<std::uint16_t>(4);
  if (!reservedIsZero || (flags & kReservedFlags) != 0) return std::nullopt;
  return Request{*reader.at<std::uint32_t>(0), (flags >> kListShift) & kListMask,
                 (flags & kSizeQueryFlag) != 0};
}

std::optional<std::int64_t> integerOf(const PlistDictionary& dictionary, std::string_view key) {
  return dictionary.get(key).asInteger();
}

KdStatus fill(std::span<const std::byte> data, std::size_t most, std::span<std::byte> output,
              std::size_t& outputSize) {
  outputSize = std::min({data.size(), most, output.size()});
  std::copy_n(data.begin(), outputSize, output.begin());
  return kKdSuccess;
}

class StorageClient : public UserClient {
 public:
  StorageClient(const PlistDictionary& client, Recordings& recordings)
      : buffers_(client.get("buffers")),
        recommendation_(client.get("recommendation")),
        recordings_(recordings) {}

  KdStatus callStruct(std::uint32_t method, std::span<const std::byte> input, std::span<std::byte> output,
                      std::size_t& outputSize) override {
    output = output.first(std::min(outputSize, output.size()));
    const PlistDictionary* recommendation = recommendation_.asDictionary();
    // The method may also be that of requests, which bring a structure.
    if (input.empty() && recommendation != nullptr && integerOf(*recommendation, "method") == method)
      return answerRecommendation(*recommendation, output, outputSize);
    const auto request = parseRequest(input);
    const PlistDictionary* buffer = request ? findBuffer(method, *request) : nullptr;
    return buffer != nullptr ? answer(*buffer, *request, output, outputSize) : kKdBadArgument;
  }

 private:
  static KdStatus answerRecommendation(const PlistDictionary& recommendation, std::span<std::byte> output,
                                       std::size_t& outputSize) {
    if (const KdStatus status = statusOf(recommendation, "status"); status != kKdSuccess) return status;
    const PlistValue data = recommendation.get("data");
    return fill(data.asData().value_or(std::span<const std::byte>()), output.size(), output, outputSize);
  }

  const PlistDictionary* findBuffer(std::uint32_t method, const Request& request) const {
    if (buffers_.asArray() == nullptr) return nullptr;
    for (const PlistValue& element : *buffers_.asArray()) {
      const PlistDictionary* buffer = element.asDictionary();
      if (buffer == nullptr || integerOf(*buffer, "method") != method) continue;
      if (integerOf(*buffer, "code") == request.code &&
          integerOf(*buffer, "list").value_or(0) == request.list)
        return buffer;
    }
    return nullptr;
  }

  KdStatus answer(const PlistDictionary& buffer, const Request& request, std::span<std::byte> output,
                  std::size_t& outputSize) {
    FileContents file;
    const PlistValue recorded = buffer.get("data");
    std::span<const std::byte> data = recorded.asData().value_or(std::span<const std::byte>());
    if (const PlistValue name = buffer.get("file"); name.asString()) {
      if (!recordings_.readFile(*name.asString(), file)) return kKdNotFound;
      data = file.bytes;
    }
    const auto size = static_cast<std::uint32_t>(
        integerOf(buffer, "size").value_or(static_cast<std::int64_t>(data.size())));
    // Room for a size where there is another number of bytes to fetch: a size query, whatever its flag says.
    const bool asksForSize = output.size() == kSizeAnswer && size != kSizeAnswer;
    if (!request.isSizeQuery && !(asksForSize && !request.code)) {
      if (asksForSize) return kKdBadArgument;  // its flag is clear
      if (const KdStatus status = statusOf(buffer, "dataStatus"); status != kKdSuccess) return status;
      const std::int64_t most = integerOf(buffer, "fill").value_or(static_cast<std::int64_t>(output.size()));
      return fill(data, static_cast<std::size_t>(std::max<std::int64_t>(most, 0)), output, outputSize);
    }
    if (const KdStatus status = statusOf(buffer, "sizeStatus"); status != kKdSuccess) return status;
    if (output.size() < kSizeAnswer) return kKdBadArgument;
    writeLittleEndian(output.first(kSizeAnswer), size);
    outputSize = kSizeAnswer;
    return kKdSuccess;
  }

  const PlistValue buffers_;
  const PlistValue recommendation_;
  Recordings& recordings_;
};

}  // namespace

std::unique_ptr<UserClient> makeStorageClient(const PlistDictionary& client, Recordings& recordings) {
  return std::make_unique<StorageClient>(client, recordings);
}

}  // namespace tbdaily
