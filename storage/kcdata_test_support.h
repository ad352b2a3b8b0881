// Kcdata buffers for tests and benchmarks.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "platform/byte_writer.h"

namespace tbdaily::testing {

class KcdataBuffer {
 public:
  KcdataBuffer& item(std::uint32_t type, std::string_view payload, std::uint64_t flags = 0) {
    return number(type, 4).number(payload.size(), 4).number(flags, 8).append(payload);
  }
  KcdataBuffer& begin(std::uint64_t identifier) { return item(0x13, "kind", identifier); }
  KcdataBuffer& end(std::uint64_t identifier) { return item(0x14, "", identifier); }
  KcdataBuffer& name(std::string_view text) { return item(0x909, text); }
  // `written` fills as many of its 8 bytes as the size leaves.
  KcdataBuffer& ioStats(std::uint64_t written, std::size_t size = 40) {
    KcdataBuffer payload;
    payload.number(1, 8).number(2, 8).number(3, 8).number(written, 8).number(5, 8);
    return item(0x901, std::string_view(payload.bytes).substr(0, size));
  }
  KcdataBuffer& bufferEnd() { return item(0xF19158ED, ""); }
  KcdataBuffer& append(std::string_view more) { return bytes += more, *this; }

  std::string bytes;

 private:
  KcdataBuffer& number(std::uint64_t value, unsigned size) {
    appendLittleEndian(bytes, value, size);
    return *this;
  }
};

}  // namespace tbdaily::testing
