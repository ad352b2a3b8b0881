// What the contract tests have in common. A subject is default-constructible and has `Platform& services`.
#pragma once

#include <gtest/gtest.h>

#include <cmath>
#include <limits>

#include "platform/families.h"

namespace tbdaily::testing {

inline PlistData bytesOf(std::string_view text) {
  const auto bytes = std::as_bytes(std::span(text));
  return {bytes.begin(), bytes.end()};
}

template <typename Subject>
struct ContractTest : ::testing::Test {
  Subject subject;
  Platform& services = subject.services;
};

}  // namespace tbdaily::testing
