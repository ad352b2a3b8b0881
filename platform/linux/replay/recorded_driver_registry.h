// The driver registry of a recording, registry.plist: entries with properties and parents, and user clients
// that answer as they were recorded. Without the recording everything answers as absent. Any thread may call;
// an object or connection is for one thread at a time.
#pragma once

#include <map>
#include <memory>
#include <mutex>

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
  std::size_t openHandles() const {
    const std::lock_guard guard(mutex_);
    return entries_.size() + iterators_.size() + connections_.size();
  }

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

  // What a handle stands for stays where it is until the handle is given back.
  template <typename T>
  using Handles = std::map<KdHandle, T>;

  // A new handle.
  template <typename T>
  KdHandle add(Handles<T>& handles, T value) {
    const std::lock_guard guard(mutex_);
    handles.emplace(++lastHandle_, std::move(value));
    return lastHandle_;
  }
  // Null when there is no such handle of this kind.
  template <typename T>
  T* find(Handles<T>& handles, KdHandle handle) {
    const std::lock_guard guard(mutex_);
    const auto found = handles.find(handle);
    return found != handles.end() ? &found->second : nullptr;
  }

  PlistValue recordedEntries();
  // A handle for the next entry from `from` on that matches, or 0; `from` then is the place behind it.
  KdHandle nextMatch(const PlistValue& entries, const PlistValue& matching, std::size_t& from);
  // Null when the handle is no registry entry.
  const PlistDictionary* entryOf(KdHandle handle);
  RecordedClient* clientOf(KdHandle connection);

  Recordings& recordings_;
  mutable std::mutex mutex_;  // of what follows
  KdHandle lastHandle_ = 0;
  Handles<PlistValue> entries_;
  Handles<Iterator> iterators_;
  Handles<Connection> connections_;
};

}  // namespace tbdaily
