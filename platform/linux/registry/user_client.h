// What answers the calls of one user-client connection.
#pragma once

#include "platform/driver_registry.h"

namespace tbdaily {

// Calls that a kind of client does not know fail with kKdBadArgument.
class UserClient {
 public:
  virtual ~UserClient() = default;

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

}  // namespace tbdaily
