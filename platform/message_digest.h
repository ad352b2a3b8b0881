// Message digests of byte buffers.
#pragma once

#include <array>
#include <cstddef>
#include <span>

namespace tbdaily {

using Md5Digest = std::array<std::byte, 16>;

class MessageDigest {
 public:
  virtual ~MessageDigest() = default;
  virtual Md5Digest md5(std::span<const std::byte> bytes) = 0;  // RFC 1321
};

}  // namespace tbdaily
