// Digests of bytes.
#pragma once

#include "platform/message_digest.h"

namespace tbdaily {

class LinuxMessageDigest : public MessageDigest {
 public:
  Md5Digest md5(std::span<const std::byte> bytes) override;
};

}  // namespace tbdaily
