// A driver registry over a list of entries: dictionaries with "id", "name", "class", "parent", "properties"
// and "client". Without a list everything answers as absent. Any thread may call; an object or connection is
// for one thread at a time.
#pragma once

#include <map>
#include <memory>
#include <mutex>

#include "platform/driver_registry.h"
#include "platform/linux/registry/user_client.h"

namespace tbdaily {

class EntryRegistry : public DriverRegistry {
 public:
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

 protected:
  // The entries as they are now, an array; anything else where there is no registry.
  virtual PlistValue currentEntries() = 0;
  // What answers for an entry's "client"; null for a kind that is not known.
  virtual std::unique_ptr<UserClient> makeClient(const PlistDictionary& client) = 0;

 private:
  struct Iterator {
    PlistValue matching;
    PlistValue entries;  // as they were when the walk began
    std::size_t next = 0;
  };
  struct Connection {
    std::unique_ptr<UserClient> client;
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

  // A handle for the next entry from `from` on that matches, or 0; `from` then is the place behind it.
  KdHandle nextMatch(const PlistValue& entries, const PlistValue& matching, std::size_t& from);
  // Null when the handle is no registry entry.
  const PlistDictionary* entryOf(KdHandle handle);
  UserClient* clientOf(KdHandle connection);

  mutable std::mutex mutex_;  // of what follows
  KdHandle lastHandle_ = 0;
  Handles<PlistValue> entries_;
  Handles<Iterator> iterators_;
  Handles<Connection> connections_;
};

// An integer entry of a dictionary as a status, given signed or unsigned; 0 when absent.
KdStatus statusOf(const PlistDictionary& dictionary, std::string_view key);

}  // namespace tbdaily
