// The kernel driver registry and user-client connections.
//
// Absent service: no matching description, no matching service, iterators that end at once, failed statuses.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>

#include "platform/plist_value.h"
#include "platform/status.h"

namespace tbdaily {

// A service, iterator, registry entry or connection; 0 is none. The caller releases objects and closes
// connections.
using KdHandle = std::uint32_t;

enum class KdRegistryPlane : std::uint8_t { KdService };

// How far a property search goes.
enum class KdSearchOptions : std::uint32_t { RecursivelyTowardsParents = 3 };

// Scalar and structure arguments of one user-client call. Spans are borrowed for the call.
struct KdMethodInput {
  std::span<const std::uint64_t> scalars;
  std::span<const std::byte> structure;
};
struct KdMethodOutput {
  std::span<std::uint64_t> scalars;
  std::size_t scalarCount = 0;  // out: how many of `scalars` were filled
  std::span<std::byte> structure;
  std::size_t structureSize =
      0;  // out: how many bytes of `structure` were filled, or the answer of a size query
};

class DriverRegistry {
 public:
  virtual ~DriverRegistry() = default;

  // A description that matches services of the class, or none when the service is absent.
  virtual PlistValue KdServiceMatching(std::string_view serviceClass) = 0;
  // The first matching service, or 0.
  virtual KdHandle KdServiceGetMatchingService(const PlistValue& matching) = 0;
  virtual KdStatus KdServiceGetMatchingServices(const PlistValue& matching, KdHandle& iterator) = 0;
  // The next object of the walk, or 0 at its end.
  virtual KdHandle KdIteratorNext(KdHandle iterator) = 0;
  // False when the registry changed during the walk.
  virtual bool KdIteratorIsValid(KdHandle iterator) = 0;
  virtual KdStatus KdObjectRelease(KdHandle object) = 0;
  // 0 marks a dead object.
  virtual std::uint32_t KdObjectGetUserRetainCount(KdHandle object) = 0;

  // A property of the entry itself, or none.
  virtual PlistValue KdRegistryEntryCreateCFProperty(KdHandle entry, std::string_view key) = 0;
  // A property of the entry or of its nearest parent that has it, or none.
  virtual PlistValue KdRegistryEntrySearchCFProperty(KdHandle entry, KdRegistryPlane plane,
                                                     std::string_view key, KdSearchOptions options) = 0;
  virtual KdStatus KdRegistryEntryGetRegistryEntryID(KdHandle entry, std::uint64_t& identifier) = 0;
  // At most 128 bytes.
  virtual KdStatus KdRegistryEntryGetName(KdHandle entry, std::string& name) = 0;

  virtual KdStatus KdServiceOpen(KdHandle service, std::uint32_t connectionType, KdHandle& connection) = 0;
  virtual KdStatus KdServiceClose(KdHandle connection) = 0;
  // `outputSize` holds the size of `output` on entry and the number of bytes filled on return.
  virtual KdStatus KdConnectCallStructMethod(KdHandle connection, std::uint32_t method,
                                             std::span<const std::byte> input, std::span<std::byte> output,
                                             std::size_t& outputSize) = 0;
  // `outputCount` is the number of `outputs` that were filled.
  virtual KdStatus KdConnectCallScalarMethod(KdHandle connection, std::uint32_t method,
                                             std::span<const std::uint64_t> inputs,
                                             std::span<std::uint64_t> outputs, std::size_t& outputCount) = 0;
  virtual KdStatus KdConnectCallMethod(KdHandle connection, std::uint32_t method, const KdMethodInput& input,
                                       KdMethodOutput& output) = 0;
  // The memory stays mapped, and `memory` valid, until it is unmapped or the connection is closed.
  virtual KdStatus KdConnectMapMemory(KdHandle connection, std::uint32_t memoryType,
                                      std::span<std::byte>& memory) = 0;
  virtual KdStatus KdConnectUnmapMemory(KdHandle connection, std::uint32_t memoryType,
                                        std::span<std::byte> memory) = 0;
};

}  // namespace tbdaily
