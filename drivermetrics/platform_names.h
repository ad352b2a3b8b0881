// The platform's types that users of the library meet, under the library's own name.
#pragma once

#include "platform/driver_handle.h"
#include "platform/driver_registry.h"
#include "platform/plist_value.h"
#include "platform/status.h"

namespace kdreport {

using tbdaily::NumberKind;
using tbdaily::PlistArray;
using tbdaily::PlistData;
using tbdaily::PlistDate;
using tbdaily::PlistDictionary;
using tbdaily::PlistNumber;
using tbdaily::PlistValue;

using tbdaily::DriverHandle;
using tbdaily::DriverRegistry;
using tbdaily::KdHandle;
using tbdaily::KdMethodInput;
using tbdaily::KdMethodOutput;
using tbdaily::KdRegistryPlane;
using tbdaily::KdSearchOptions;

using tbdaily::KdStatus;
using tbdaily::kKdAborted;
using tbdaily::kKdBadArgument;
using tbdaily::kKdError;
using tbdaily::kKdInternalError;
using tbdaily::kKdIOError;
using tbdaily::kKdNoMemory;
using tbdaily::kKdNotFound;
using tbdaily::kKdSuccess;
using tbdaily::kKdUnderrun;
using tbdaily::kKdUnsupportedMode;

// The keys of a matching description, a dictionary that DriverRegistry takes: drivers of a class, or those
// whose properties equal every value of a dictionary.
namespace kd_matching_key {
inline constexpr std::string_view kProviderClass = "KdProviderClass";  // string
inline constexpr std::string_view kPropertyMatch = "KdPropertyMatch";  // dictionary; counts before the class
}  // namespace kd_matching_key

}  // namespace kdreport
