// The user clients of a recording: a driver's "client" as it was recorded.
#pragma once

#include <memory>

#include "platform/linux/registry/user_client.h"
#include "platform/linux/replay/recordings.h"

namespace tbdaily {

// A client of {"kind": "storage"}: a strict storage controller. Borrows the recordings.
std::unique_ptr<UserClient> makeStorageClient(const PlistDictionary& client, Recordings& recordings);

// A client of {"kind": "hub"}: a strict driver metrics hub, whose values are those of hub.plist. Borrows the
// recordings.
std::unique_ptr<UserClient> makeRecordedHub(const PlistDictionary& client, Recordings& recordings);

}  // namespace tbdaily
