// Activated-app info: the list of apps that a peer sends for the daily report.
#pragma once

#include "platform/plist_value.h"

namespace tbdaily {

// The array of AppInfoRecord ("bundle", "version", "kestrelID", "arch", "uuid") of a message's "app_data"
// elements, in their order. An element that is no dictionary, or lacks a field of its type, is skipped. Never
// none: without elements the array is empty.
PlistValue appInfoFromMessage(const PlistValue& message);

}  // namespace tbdaily
