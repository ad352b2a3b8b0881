// The driver registry of a recording, registry.plist: entries with properties and parents, and user clients
// that answer as they were recorded. Without the recording everything answers as absent. For the main thread
// only.
#pragma once

#include <map>
#include <memory>

#include "platform/driver_registry.h"
#include "platform/linux/replay/recorded_client.h"
#include "platform/linux/replay/recordings.h"

namespace tbdaily {

class RecordedDriverRegistry : public DriverRegistry {
 public:
  explicit RecordedDriverRegistry(Recordings& recordings) : recordings_(recordings) {}

  PlistValue KdServiceMatching(std::string_view serviceClass) override;
  KdHandle KdServiceGetMatchingService(const PlistValue& matching) override;
  KdStatus KdServiceGetMatchingServices(const PlistValue& matching, KdHandle& iterator) override;
  KdHandle KdIteratorNext(KdHandle iterator) override;
  bool KdIteratorIsValid(KdHandle iterator) override;
  KdStatus KdObjectRelease(KdHandle object) override;
  std::uint32_t KdObjectGetUserRetainCount(KdHandle object) override;
  PlistValue KdRegistryEntryCreateCFProperty(KdHandle entry, std::string_view key) override;
  PlistValue KdRegistryEntrySearchCFProperty(KdHandle entry, KdRegistryPlane plane, std::string_view key,
                                             KdSearchOptions options) override;
  KdStatus KdRegistryEntryGetRegistryEntryID(KdHandle entry, std::uint64_t& identifier) override;
  KdStatus KdRegistryEntryGetName(KdHandle entry, std::string& name) override;
  KdStatus KdServiceOpen(KdHandle service, std::uint32_t connectionType, KdHandle& connection) override;
  KdStatus KdServiceClose(KdHandle connection) override;
  KdStatus KdConnectCallStructMethod(KdHandle connection, std::uint32_t method,
                                     std::span<const std::byte> input, std::span<std::byte> output,
                                     std::size_t& outputSize) override;
  KdStatus KdConnectCallScalarMethod(KdHandle connection, std::uint32_t method,
                                     std::span<const std::uint64_t> inputs, std::span<std::uint64_t> outputs,
                                     std::size_t& outputCount) override;
  KdStatus KdConnectCallMethod(KdHandle connection, std::uint32_t method, const KdMethodInput& input,
                               KdMethodOutput& output) override;
  KdStatus KdConnectMapMemory(KdHandle connection, std::uint32_t memoryType,
                              std::span<std::byte>& memory) override;
  KdStatus KdConnectUnmapMemory(KdHandle connection, std::uint32_t memoryType,
                                std::span<std::byte> memory) override;

  // Objects, iterators and connections that nobody has given back.
  std::size_t openHandles() const { return entries_.size() + iterators_.size() + connections_.size(); }

 private:
  struct Iterator {
    PlistValue matching;
    PlistValue entries;  // as they were when the walk began
    std::size_t next = 0;
  };
  struct Connection {
    std::unique_ptr<RecordedClient> client;
    KdStatus closeStatus = kKdSuccess;
  };

  PlistValue recordedEntries();
  // A handle for the next entry from `from` on that matches, or 0; `from` then is the place behind it.
  KdHandle nextMatch(const PlistValue& entries, const PlistValue& matching, std::size_t& from);
  // Null when the handle is no registry entry.
  const PlistDictionary* entryOf(KdHandle handle) const;
  RecordedClient* clientOf(KdHandle connection);

  Recordings& recordings_;
  KdHandle lastHandle_ = 0;
  std::map<KdHandle, PlistValue> entries_;
  std::map<KdHandle, Iterator> iterators_;
  std::map<KdHandle, Connection> connections_;
};

}  // namespace tbdaily
