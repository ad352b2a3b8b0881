// A driver metrics hub in a fake driver registry: its steps fail as they are told to, its buffer is the
// test's.
#pragma once

#include "testing/fake_driver_registry.h"

namespace tbdaily::testing {

class ScriptedHub {
 public:
  // Wide on purpose: the memory type is the low half.
  static constexpr std::uint64_t kBufferIdentifier = 0x9'00000007;

  explicit ScriptedHub(FakeDriverRegistry& registry) {
    registry.drivers.push_back(
        {.identifier = 1, .name = "Hub", .serviceClass = "KdReportHub", .properties = {}, .parent = {}});
    registry.scalarMethod = [this](auto&, std::uint32_t method, auto, auto, auto&) {
      return method == 0 ? userClientOpenStatus : kKdBadArgument;
    };
    registry.method = [this](auto&, std::uint32_t method, const KdMethodInput& input,
                             KdMethodOutput& output) {
      if (method == 3)
        return !input.scalars.empty() && input.scalars[0] == kBufferIdentifier ? updateStatus : kKdError;
      interestList.assign(input.structure.begin(), input.structure.end());
      output.scalars[0] = kBufferIdentifier;
      output.scalarCount = scalars;
      return configureStatus;
    };
    registry.mapMemory = [this](auto&, std::uint32_t type, std::span<std::byte>& memory) {
      memory = buffer;
      return type == static_cast<std::uint32_t>(kBufferIdentifier) ? mapStatus : kKdBadArgument;
    };
  }
  ScriptedHub(const ScriptedHub&) = delete;
  ScriptedHub& operator=(const ScriptedHub&) = delete;

  KdStatus userClientOpenStatus = 0, configureStatus = 0, mapStatus = 0, updateStatus = 0;
  std::size_t scalars = 1;  // that configuring answers
  PlistData interestList;   // what it was told last
  PlistData buffer;         // keeps its length while a subscription maps it
};

}  // namespace tbdaily::testing
