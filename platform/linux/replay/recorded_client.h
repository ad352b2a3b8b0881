// What answers the calls of one user-client connection: a driver's "client" as it was recorded.
#pragma once

#include <memory>

#include "platform/driver_registry.h"
#include "platform/linux/replay/recordings.h"

namespace tbdaily {

// Calls that a kind of client does not know fail with kKdBadArgument.
class RecordedClient {
 public:
  virtual ~RecordedClient() = default;

  virtual KdStatus callStruct(std::uint32_t, std::span<const std::byte>, std::span<std::byte>, std::size_t&) {
    return kKdBadArgument;
  }
  virtual KdStatus callScalar(std::uint32_t, std::span<const std::uint64_t>, std::span<std::uint64_t>,
                              std::size_t&) {
    return kKdBadArgument;
  }
  virtual KdStatus call(std::uint32_t, const KdMethodInput&, KdMethodOutput&) { return kKdBadArgument; }
  virtual KdStatus mapMemory(std::uint32_t, std::span<std::byte>&) { return kKdBadArgument; }
  virtual KdStatus unmapMemory(std::uint32_t, std::span<std::byte>) { return kKdBadArgument; }
};

// A client of {"kind": "storage"}: a strict storage controller. Borrows the recordings.
std::unique_ptr<RecordedClient> makeStorageClient(const PlistDictionary& client, Recordings& recordings);

// A client of {"kind": "hub"}: a strict driver metrics hub, whose values are those of hub.plist. Borrows the
// recordings.
std::unique_ptr<RecordedClient> makeHubClient(const PlistDictionary& client, Recordings& recordings);

// An integer entry of a recording as a status, recorded signed or unsigned; 0 when absent.
KdStatus recordedStatus(const PlistDictionary& dictionary, std::string_view key);

}  // namespace tbdaily
