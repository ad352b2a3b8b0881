#include "platform/linux/linux_message_digest.h"

#include <md5.h>

#include <array>
#include <cstdint>

namespace tbdaily {

Md5Digest LinuxMessageDigest::md5(std::span<const std::byte> bytes) {
  MD5_CTX context;
  ::MD5Init(&context);
  ::MD5Update(&context, reinterpret_cast<const std::uint8_t*>(bytes.data()), bytes.size());
  std::array<std::uint8_t, MD5_DIGEST_LENGTH> result{};
  ::MD5Final(result.data(), &context);
  Md5Digest digest;
  for (std::size_t i = 0; i < digest.size(); ++i) digest[i] = static_cast<std::byte>(result[i]);
  return digest;
}

}  // namespace tbdaily
