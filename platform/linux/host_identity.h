// Texts that identify the host and its hardware in diagnostic logs.
#pragma once

#include <string>

#include "platform/linux/base/host.h"

namespace tbdaily {

// 32 hexadecimal digits that stay the same for this installation and tell nothing about it: the keyed hash of
// /etc/machine-id that machine-id(5) recommends for applications (HMAC-SHA256 under this application's own
// identifier, marked as a version 4 UUID). Empty when there is no machine id.
std::string hashedMachineIdentifier(const Host& host);

// The DMI product name or the device tree's model; empty when neither is known.
std::string hardwareModelName(const Host& host);

// A fresh random UUID in upper case.
std::string randomUuid();

}  // namespace tbdaily
