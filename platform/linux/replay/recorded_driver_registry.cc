#include "platform/linux/replay/recorded_driver_registry.h"

#include <algorithm>
#include <array>

#include "platform/linux/replay/recorded_clients.h"

namespace tbdaily {

namespace {

// The kinds of user clients that a recording may give an entry.
struct ClientKind {
  std::string_view name;
  std::unique_ptr<UserClient> (*make)(const PlistDictionary& client, Recordings& recordings);
};
constexpr std::array<ClientKind, 2> kClientKinds{{{"storage", makeStorageClient}, {"hub", makeRecordedHub}}};

}  // namespace

PlistValue RecordedDriverRegistry::currentEntries() {
  return recordings_.entry(recording::kRegistry, "entries");
}

std::unique_ptr<UserClient> RecordedDriverRegistry::makeClient(const PlistDictionary& client) {
  const PlistValue name = client.get("kind");
  const auto kind = std::ranges::find(kClientKinds, name.asString().value_or(""), &ClientKind::name);
  return kind != kClientKinds.end() ? kind->make(client, recordings_) : nullptr;
}

}  // namespace tbdaily
