#include "platform/linux/registry/entry_registry.h"

#include <algorithm>
#include <iterator>

#include "platform/utf8.h"

namespace tbdaily {

namespace {

constexpr std::string_view kProviderClass = "KdProviderClass";
constexpr std::string_view kPropertyMatch = "KdPropertyMatch";
constexpr std::size_t kLongestName = 128;

PlistDictionary propertiesOf(const PlistDictionary& entry) {
  return entry.get("properties").mutableDictionary();
}

// Numbers of different widths are equal when they mean the same.
bool meanTheSame(const PlistValue& a, const PlistValue& b) {
  const auto left = a.asNumber(), right = b.asNumber();
  if (!left || !right) return a == b;
  if (!left->isReal() && !right->isReal()) return left->toInt64() == right->toInt64();
  return left->toDouble() == right->toDouble();
}

bool matches(const PlistDictionary& entry, const PlistDictionary& matching) {
  if (const PlistValue* wanted = matching.find(kPropertyMatch)) {
    const PlistDictionary properties = propertiesOf(entry);
    const PlistDictionary* values = wanted->asDictionary();
    return values != nullptr && std::all_of(values->begin(), values->end(), [&properties](const auto& value) {
             const PlistValue* property = properties.find(value.first);
             return property != nullptr && meanTheSame(*property, value.second);
           });
  }
  const PlistValue wanted = matching.get(kProviderClass);
  return wanted.asString() && entry.get("class").asString() == wanted.asString();
}

}  // namespace

PlistValue EntryRegistry::KdServiceMatching(std::string_view serviceClass) {
  if (currentEntries().asArray() == nullptr) return {};
  return PlistValue::dictionary(
      {{std::string(kProviderClass), PlistValue::string(std::string(serviceClass))}});
}

KdHandle EntryRegistry::nextMatch(const PlistValue& entries, const PlistValue& matching, std::size_t& from) {
  const PlistArray* list = entries.asArray();
  const PlistDictionary* wanted = matching.asDictionary();
  if (list == nullptr || wanted == nullptr) return 0;
  while (from < list->size()) {
    const PlistValue& entry = (*list)[from++];
    if (entry.asDictionary() == nullptr || !matches(*entry.asDictionary(), *wanted)) continue;
    return add(entries_, entry);
  }
  return 0;
}

KdHandle EntryRegistry::KdServiceGetMatchingService(const PlistValue& matching) {
  std::size_t from = 0;
  return nextMatch(currentEntries(), matching, from);
}

KdStatus EntryRegistry::KdServiceGetMatchingServices(const PlistValue& matching, KdHandle& iterator) {
  iterator = 0;
  PlistValue entries = currentEntries();
  if (entries.asArray() == nullptr) return kKdNotFound;
  if (matching.asDictionary() == nullptr) return kKdBadArgument;
  iterator = add(iterators_, Iterator{matching, std::move(entries), 0});
  return kKdSuccess;
}

KdHandle EntryRegistry::KdIteratorNext(KdHandle iterator) {
  Iterator* walk = find(iterators_, iterator);
  return walk != nullptr ? nextMatch(walk->entries, walk->matching, walk->next) : 0;
}

bool EntryRegistry::KdIteratorIsValid(KdHandle iterator) {
  const Iterator* walk = find(iterators_, iterator);
  return walk != nullptr && walk->entries == currentEntries();
}

KdStatus EntryRegistry::KdObjectRelease(KdHandle object) {
  const std::lock_guard guard(mutex_);
  return entries_.erase(object) + iterators_.erase(object) != 0 ? kKdSuccess : kKdBadArgument;
}

const PlistDictionary* EntryRegistry::entryOf(KdHandle handle) {
  const PlistValue* entry = find(entries_, handle);
  return entry != nullptr ? entry->asDictionary() : nullptr;
}

std::uint32_t EntryRegistry::KdObjectGetUserRetainCount(KdHandle object) {
  const PlistDictionary* entry = entryOf(object);
  if (entry == nullptr) return 0;
  return static_cast<std::uint32_t>(entry->get("retainCount").asInteger().value_or(1));
}

PlistValue EntryRegistry::KdRegistryEntryCreateCFProperty(KdHandle handle, std::string_view key) {
  const PlistDictionary* entry = entryOf(handle);
  return entry != nullptr ? propertiesOf(*entry).get(key) : PlistValue();
}

PlistValue EntryRegistry::KdRegistryEntrySearchCFProperty(KdHandle handle, KdRegistryPlane,
                                                          std::string_view key, KdSearchOptions) {
  const PlistDictionary* entry = entryOf(handle);
  const PlistValue all = currentEntries();
  const std::size_t longestWay = all.asArray() != nullptr ? all.asArray()->size() : 0;
  for (std::size_t steps = 0; entry != nullptr; ++steps) {
    if (PlistValue value = propertiesOf(*entry).get(key); !value.isNone()) return value;
    const auto parent = entry->get("parent").asInteger();
    if (!parent || steps >= longestWay) break;  // parents in a circle end too
    const auto found = std::find_if(
        all.asArray()->begin(), all.asArray()->end(),
        [&parent](const PlistValue& candidate) { return candidate.get("id").asInteger() == parent; });
    entry = found != all.asArray()->end() ? found->asDictionary() : nullptr;
  }
  return {};
}

KdStatus EntryRegistry::KdRegistryEntryGetRegistryEntryID(KdHandle handle, std::uint64_t& identifier) {
  const PlistDictionary* entry = entryOf(handle);
  if (entry == nullptr) return kKdBadArgument;
  const auto recorded = entry->get("id").asInteger();
  if (!recorded) return kKdNotFound;
  identifier = static_cast<std::uint64_t>(*recorded);
  return kKdSuccess;
}

KdStatus EntryRegistry::KdRegistryEntryGetName(KdHandle handle, std::string& name) {
  const PlistDictionary* entry = entryOf(handle);
  if (entry == nullptr) return kKdBadArgument;
  const PlistValue recorded = entry->get("name");
  if (!recorded.asString()) return kKdNotFound;
  name = wholeCharacters(*recorded.asString(), kLongestName);
  return kKdSuccess;
}

KdStatus EntryRegistry::KdServiceOpen(KdHandle service, std::uint32_t, KdHandle& connection) {
  connection = 0;
  const PlistDictionary* entry = entryOf(service);
  if (entry == nullptr) return kKdBadArgument;
  const PlistValue recorded = entry->get("client");
  const PlistDictionary* client = recorded.asDictionary();
  if (client == nullptr) return kKdNotFound;
  auto opened = makeClient(*client);
  if (opened == nullptr) return kKdNotFound;
  if (const KdStatus status = statusOf(*client, "openStatus"); status != kKdSuccess) return status;
  connection = add(connections_, Connection{std::move(opened), statusOf(*client, "closeStatus")});
  return kKdSuccess;
}

KdStatus EntryRegistry::KdServiceClose(KdHandle connection) {
  Handles<Connection>::node_type closed;
  {
    const std::lock_guard guard(mutex_);
    closed = connections_.extract(connection);
  }
  return closed.empty() ? kKdBadArgument : closed.mapped().closeStatus;
}

UserClient* EntryRegistry::clientOf(KdHandle connection) {
  const Connection* found = find(connections_, connection);
  return found != nullptr ? found->client.get() : nullptr;
}

KdStatus EntryRegistry::KdConnectCallStructMethod(KdHandle connection, std::uint32_t method,
                                                  std::span<const std::byte> input,
                                                  std::span<std::byte> output, std::size_t& outputSize) {
  UserClient* client = clientOf(connection);
  return client != nullptr ? client->callStruct(method, input, output, outputSize) : kKdBadArgument;
}

KdStatus EntryRegistry::KdConnectCallScalarMethod(KdHandle connection, std::uint32_t method,
                                                  std::span<const std::uint64_t> inputs,
                                                  std::span<std::uint64_t> outputs,
                                                  std::size_t& outputCount) {
  UserClient* client = clientOf(connection);
  return client != nullptr ? client->callScalar(method, inputs, outputs, outputCount) : kKdBadArgument;
}

KdStatus EntryRegistry::KdConnectCallMethod(KdHandle connection, std::uint32_t method,
                                            const KdMethodInput& input, KdMethodOutput& output) {
  UserClient* client = clientOf(connection);
  return client != nullptr ? client->call(method, input, output) : kKdBadArgument;
}

KdStatus EntryRegistry::KdConnectMapMemory(KdHandle connection, std::uint32_t memoryType,
                                           std::span<std::byte>& memory) {
  memory = {};
  UserClient* client = clientOf(connection);
  return client != nullptr ? client->mapMemory(memoryType, memory) : kKdBadArgument;
}

KdStatus EntryRegistry::KdConnectUnmapMemory(KdHandle connection, std::uint32_t memoryType,
                                             std::span<std::byte> memory) {
  UserClient* client = clientOf(connection);
  return client != nullptr ? client->unmapMemory(memoryType, memory) : kKdBadArgument;
}

KdStatus statusOf(const PlistDictionary& dictionary, std::string_view key) {
  return static_cast<KdStatus>(static_cast<std::uint64_t>(dictionary.get(key).asInteger().value_or(0)) &
                               0xFFFFFFFF);
}

}  // namespace tbdaily
