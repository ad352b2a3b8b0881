// A fake driver registry: the drivers that a test describes, with the answers of their user clients. Without
// drivers it answers as the registry of a host that has none. For one thread at a time.
#pragma once

#include <algorithm>
#include <functional>
#include <map>
#include <utility>
#include <vector>

#include "platform/driver_registry.h"
#include "testing/scripted_driver.h"

namespace tbdaily::testing {

// A matching description matches on the class, or, with "KdPropertyMatch", on properties that equal every
// value in it.
class FakeDriverRegistry : public DriverRegistry {
 public:
  std::vector<ScriptedDriver> drivers;  // in the order in which they are found
  bool iteratorsAreValid = true;
  KdStatus openStatus = kKdSuccess, closeStatus = kKdSuccess;
  // The user clients' answers; without one a call is a bad argument. Outputs as in DriverRegistry.
  std::function<KdStatus(const ScriptedDriver&, std::uint32_t method, std::span<const std::byte> input,
                         std::span<std::byte> output, std::size_t& outputSize)>
      structMethod;
  std::function<KdStatus(const ScriptedDriver&, std::uint32_t method, std::span<const std::uint64_t> inputs,
                         std::span<std::uint64_t> outputs, std::size_t& outputCount)>
      scalarMethod;
  std::function<KdStatus(const ScriptedDriver&, std::uint32_t method, const KdMethodInput&, KdMethodOutput&)>
      method;
  std::function<KdStatus(const ScriptedDriver&, std::uint32_t memoryType, std::span<std::byte>& memory)>
      mapMemory;

  // Objects that were not released and connections that were not closed; memory that was not unmapped.
  std::size_t openHandles() const { return handles_.size(); }
  int mappings = 0;

  PlistValue KdServiceMatching(std::string_view serviceClass) override {
    if (drivers.empty()) return {};
    return PlistValue::dictionary({{kClassKey, PlistValue::string(std::string(serviceClass))}});
  }
  KdHandle KdServiceGetMatchingService(const PlistValue& matching) override {
    const auto found = matchingDrivers(matching);
    return found.empty() ? 0 : add({Kind::Object, found.front(), {}});
  }
  KdStatus KdServiceGetMatchingServices(const PlistValue& matching, KdHandle& iterator) override {
    iterator = 0;
    if (drivers.empty()) return kKdNotFound;
    iterator = add({Kind::Iterator, 0, matchingDrivers(matching)});
    return kKdSuccess;
  }
  KdHandle KdIteratorNext(KdHandle iterator) override {
    Handle* handle = find(iterator, Kind::Iterator);
    if (handle == nullptr || !iteratorsAreValid || handle->rest.empty()) return 0;
    const KdHandle object = add({Kind::Object, handle->rest.front(), {}});
    handle->rest.erase(handle->rest.begin());
    return object;
  }
  bool KdIteratorIsValid(KdHandle) override { return iteratorsAreValid; }
  KdStatus KdObjectRelease(KdHandle object) override {
    if (find(object, Kind::Connection) != nullptr) return kKdBadArgument;
    return handles_.erase(object) == 1 ? kKdSuccess : kKdBadArgument;
  }
  std::uint32_t KdObjectGetUserRetainCount(KdHandle object) override {
    const ScriptedDriver* driver = driverOf(object);
    return driver != nullptr ? driver->retainCount : 0;
  }

  PlistValue KdRegistryEntryCreateCFProperty(KdHandle entry, std::string_view key) override {
    const ScriptedDriver* driver = driverOf(entry);
    return driver != nullptr ? driver->properties.get(key) : PlistValue();
  }
  PlistValue KdRegistryEntrySearchCFProperty(KdHandle entry, KdRegistryPlane, std::string_view key,
                                             KdSearchOptions) override {
    const ScriptedDriver* driver = driverOf(entry);
    for (std::size_t steps = 0; driver != nullptr && steps < drivers.size(); ++steps) {
      if (driver->properties.contains(key)) return driver->properties.get(key);
      const auto parent = std::ranges::find(drivers, driver->parent, &ScriptedDriver::identifier);
      driver = driver->parent && parent != drivers.end() ? &*parent : nullptr;
    }
    return {};
  }
  KdStatus KdRegistryEntryGetRegistryEntryID(KdHandle entry, std::uint64_t& identifier) override {
    const ScriptedDriver* driver = driverOf(entry);
    if (driver == nullptr || !driver->identifier) return kKdNotFound;
    identifier = *driver->identifier;
    return kKdSuccess;
  }
  KdStatus KdRegistryEntryGetName(KdHandle entry, std::string& name) override {
    const ScriptedDriver* driver = driverOf(entry);
    if (driver == nullptr || !driver->name) return kKdNotFound;
    name = *driver->name;
    return kKdSuccess;
  }

  KdStatus KdServiceOpen(KdHandle service, std::uint32_t, KdHandle& connection) override {
    connection = 0;
    const Handle* handle = find(service, Kind::Object);
    if (handle == nullptr) return kKdNotFound;
    if (openStatus == kKdSuccess) connection = add({Kind::Connection, handle->driver, {}});
    return openStatus;
  }
  KdStatus KdServiceClose(KdHandle connection) override {
    if (find(connection, Kind::Connection) == nullptr) return kKdBadArgument;
    handles_.erase(connection);
    return closeStatus;
  }
  KdStatus KdConnectCallStructMethod(KdHandle connection, std::uint32_t number,
                                     std::span<const std::byte> input, std::span<std::byte> output,
                                     std::size_t& outputSize) override {
    return answer(connection, structMethod, number, input, output, outputSize);
  }
  KdStatus KdConnectCallScalarMethod(KdHandle connection, std::uint32_t number,
                                     std::span<const std::uint64_t> inputs, std::span<std::uint64_t> outputs,
                                     std::size_t& outputCount) override {
    return answer(connection, scalarMethod, number, inputs, outputs, outputCount);
  }
  KdStatus KdConnectCallMethod(KdHandle connection, std::uint32_t number, const KdMethodInput& input,
                               KdMethodOutput& output) override {
    return answer(connection, method, number, input, output);
  }
  KdStatus KdConnectMapMemory(KdHandle connection, std::uint32_t type,
                              std::span<std::byte>& memory) override {
    memory = {};
    const KdStatus status = answer(connection, mapMemory, type, memory);
    mappings += status == kKdSuccess ? 1 : 0;
    return status;
  }
  KdStatus KdConnectUnmapMemory(KdHandle connection, std::uint32_t, std::span<std::byte>) override {
    if (find(connection, Kind::Connection) == nullptr) return kKdBadArgument;
    --mappings;
    return kKdSuccess;
  }

 private:
  static constexpr const char* kClassKey = "KdProviderClass";
  enum class Kind { Object, Iterator, Connection };
  struct Handle {
    Kind kind;
    std::size_t driver;
    std::vector<std::size_t> rest;  // of an iterator
  };

  KdHandle add(Handle handle) {
    handles_.emplace(++lastHandle_, std::move(handle));
    return lastHandle_;
  }
  Handle* find(KdHandle handle, Kind kind) {
    const auto found = handles_.find(handle);
    return found != handles_.end() && found->second.kind == kind ? &found->second : nullptr;
  }
  const ScriptedDriver* driverOf(KdHandle object, Kind kind = Kind::Object) {
    const Handle* handle = find(object, kind);
    return handle != nullptr ? &drivers[handle->driver] : nullptr;
  }
  std::vector<std::size_t> matchingDrivers(const PlistValue& matching) const {
    const PlistDictionary description =
        matching.asDictionary() != nullptr ? *matching.asDictionary() : PlistDictionary();
    const PlistValue properties = description.get("KdPropertyMatch");
    std::vector<std::size_t> found;
    for (std::size_t i = 0; i < drivers.size(); ++i) {
      const auto has = [&](const auto& entry) {
        return drivers[i].properties.get(entry.first) == entry.second;
      };
      if (properties.asDictionary() != nullptr
              ? std::ranges::all_of(*properties.asDictionary(), has)
              : description.get(kClassKey).asString() == drivers[i].serviceClass)
        found.push_back(i);
    }
    return found;
  }
  template <typename Script, typename... Arguments>
  KdStatus answer(KdHandle connection, const Script& script, Arguments&&... arguments) {
    const ScriptedDriver* driver = driverOf(connection, Kind::Connection);
    if (driver == nullptr || !script) return kKdBadArgument;
    return script(*driver, std::forward<Arguments>(arguments)...);
  }

  std::map<KdHandle, Handle> handles_;
  KdHandle lastHandle_ = 0;
};

}  // namespace tbdaily::testing
