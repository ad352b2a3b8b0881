// Fixtures of tests as JSON text: numbers are 64-bit integers or doubles, null is not to be had.
#pragma once

#include <gtest/gtest.h>

#include "platform/plist/json.h"

namespace tbdaily::testing {

inline PlistValue plistOf(std::string_view json) {
  const PlistJsonResult read = plistFromJson(json);
  EXPECT_EQ(read.error, "") << json;
  return read.value;
}

inline PlistDictionary dictionaryOf(std::string_view json) {
  return plistOf(json).mutableDictionary();
}

}  // namespace tbdaily::testing
