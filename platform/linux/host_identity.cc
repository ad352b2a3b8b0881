#include "platform/linux/host_identity.h"

#include <sha2.h>

#include <array>
#include <cstdint>
#include <cstdlib>
#include <iterator>
#include <optional>
#include <span>

#include "platform/hexadecimal.h"
#include "platform/linux/base/file_io.h"
#include "platform/uuid.h"

namespace tbdaily {

namespace {

using Sha256 = std::array<std::uint8_t, SHA256_DIGEST_LENGTH>;
using IdBytes = std::array<std::uint8_t, 16>;

// Chosen once at random; it names this application in the hash.
constexpr IdBytes kApplicationIdentifier = {0x5e, 0x0c, 0x31, 0x9b, 0x7d, 0x42, 0x4f, 0x86,
                                            0xa9, 0x13, 0xc8, 0x6e, 0x2b, 0xd4, 0x70, 0xf5};

Sha256 sha256(std::span<const std::uint8_t> first, std::span<const std::uint8_t> second) {
  SHA2_CTX context;
  ::SHA256Init(&context);
  ::SHA256Update(&context, first.data(), first.size());
  ::SHA256Update(&context, second.data(), second.size());
  Sha256 digest;
  ::SHA256Final(digest.data(), &context);
  return digest;
}

// RFC 2104, for keys of at most one block.
Sha256 hmacSha256(std::span<const std::uint8_t> key, std::span<const std::uint8_t> message) {
  std::array<std::uint8_t, SHA256_BLOCK_LENGTH> inner{}, outer{};
  inner.fill(0x36);
  outer.fill(0x5c);
  for (std::size_t i = 0; i < key.size(); ++i) {
    inner[i] ^= key[i];
    outer[i] ^= key[i];
  }
  return sha256(outer, sha256(inner, message));
}

std::string firstLine(const std::filesystem::path& path) {
  constexpr std::size_t kMaximumSize = 4096;
  FileContents file;
  if (readHostFile(path, file, kMaximumSize) != 0) return {};
  std::string_view rest = file.text(), line = takeLine(rest);
  while (!line.empty() && (line.back() == '\0' || line.back() == ' ' || line.back() == '\r'))
    line.remove_suffix(1);
  return std::string(line);
}

std::optional<IdBytes> machineIdentifier(const Host& host) {
  const std::string text = firstLine(host.livePath("/etc/machine-id"));
  IdBytes bytes;
  // Lower case alone, as the file's format has it.
  const bool isWellFormed = text.find_first_not_of("0123456789abcdef") == std::string::npos;
  if (text.size() != 2 * bytes.size() || !isWellFormed) return std::nullopt;
  for (std::size_t i = 0; i < bytes.size(); ++i) {
    bytes[i] =
        static_cast<std::uint8_t>(*hexadecimalDigit(text[2 * i]) << 4 | *hexadecimalDigit(text[2 * i + 1]));
  }
  return bytes;
}

template <typename Bytes>
void markAsRandomUuid(Bytes& bytes) {
  using Byte = typename Bytes::value_type;
  bytes[6] = static_cast<Byte>((static_cast<unsigned>(bytes[6]) & 0x0F) | 0x40);
  bytes[8] = static_cast<Byte>((static_cast<unsigned>(bytes[8]) & 0x3F) | 0x80);
}

}  // namespace

std::string hashedMachineIdentifier(const Host& host) {
  const auto machine = machineIdentifier(host);
  if (!machine) return {};
  Sha256 hash = hmacSha256(*machine, kApplicationIdentifier);
  markAsRandomUuid(hash);
  std::string text;
  appendHexadecimal(text, std::as_bytes(std::span(hash).first<16>()));
  return text;
}

std::string hardwareModelName(const Host& host) {
  for (const char* place : {"/sys/class/dmi/id/product_name", "/proc/device-tree/model"}) {
    std::string model = firstLine(host.livePath(place));
    if (!model.empty()) return model;
  }
  return {};
}

std::string randomUuid() {
  UuidBytes bytes{};
  ::arc4random_buf(bytes.data(), bytes.size());
  markAsRandomUuid(bytes);
  return uuidText(bytes);
}

}  // namespace tbdaily
