// For tests of the storage modules: captured messages, statistics buffers, and a controller that answers by
// command code.
#pragma once

#include <map>
#include <string>
#include <vector>

#include "platform/byte_reader.h"
#include "platform/byte_writer.h"
#include "platform/diagnostics.h"
#include "testing/fake_diagnostics.h"
#include "testing/fake_drivers.h"

namespace tbdaily::testing {

class StatsBuffer {
 public:
  StatsBuffer& record(std::uint32_t id, const std::vector<std::uint64_t>& values) {
    word(std::uint64_t{values.size()} << 32 | id);
    for (const std::uint64_t value : values) word(value);
    return *this;
  }
  StatsBuffer& word(std::uint64_t value) {
    appendLittleEndian(bytes, value);
    return *this;
  }
  std::vector<std::byte> bytes;
};

// Answers every call of a FakeDriverRegistry with one driver. Buffers go by command code; a call without a
// request has code 0.
struct ScriptedController {
  ScriptedController(FakeDriverRegistry& registry, const char* serviceClass) {
    registry.drivers.emplace_back().serviceClass = serviceClass;
    registry.structMethod = [this](const ScriptedDriver&, std::uint32_t method,
                                   std::span<const std::byte> input, std::span<std::byte> output,
                                   std::size_t& size) {
      methods.push_back(method);
      requests.emplace_back(input.begin(), input.end());
      const ByteReader reader(input);
      const bool asksSize = input.empty() ? methods.size() == 1 : (*reader.at<std::uint16_t>(4) & 1) != 0;
      const auto& buffer = buffers[reader.at<std::uint32_t>(0).value_or(0)];
      if (asksSize) {
        writeLittleEndian(output, sizeAnswer.value_or(buffer.size()));
        return sizeStatus;
      }
      std::copy_n(buffer.begin(), std::min(buffer.size(), output.size()), output.begin());
      size = filled.value_or(std::min(buffer.size(), output.size()));
      return dataStatus;
    };
  }

  std::map<std::uint32_t, std::vector<std::byte>> buffers;
  std::optional<std::uint64_t> sizeAnswer;  // in place of the buffer's length
  std::optional<std::size_t> filled;        // in place of what was copied
  KdStatus sizeStatus = kKdSuccess, dataStatus = kKdSuccess;
  std::vector<std::uint32_t> methods;
  std::vector<std::vector<std::byte>> requests;
};

// FNV-1a, for holding a table against a checksum.
inline std::uint64_t checksum(std::string_view text) {
  std::uint64_t hash = 0xcbf29ce484222325;
  for (const char c : text) hash = (hash ^ static_cast<unsigned char>(c)) * 0x100000001b3;
  return hash;
}

}  // namespace tbdaily::testing
