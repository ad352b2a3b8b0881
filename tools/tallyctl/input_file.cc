#include "tools/tallyctl/input_file.h"

#include <array>
#include <cerrno>
#include <cstdio>
#include <string_view>

#include "platform/linux/base/host_notes.h"
#include "platform/plist/json.h"

namespace tbdaily {

namespace {

using Bytes = std::vector<std::byte>;

// Pipes too, so that the shell's substitutions work.
Outcome<Bytes> readStream(std::FILE* stream, const std::string& name) {
  Bytes bytes;
  std::array<std::byte, 65536> chunk;
  while (const std::size_t count = std::fread(chunk.data(), 1, chunk.size(), stream)) {
    bytes.insert(bytes.end(), chunk.begin(), chunk.begin() + static_cast<std::ptrdiff_t>(count));
  }
  if (std::ferror(stream) != 0) return Failure{name + ": " + errorText(errno)};
  return bytes;
}

template <typename Parsed>
Outcome<PlistValue> valueOf(Parsed parsed, const std::string& path) {
  if (!parsed.error.empty()) return Failure{path + ": " + parsed.error};
  return std::move(parsed.value);
}

bool looksLikePropertyList(std::string_view text) {
  const std::size_t first = text.find_first_not_of(" \t\r\n\xef\xbb\xbf");
  return text.starts_with("bplist") || (first != std::string_view::npos && text[first] == '<');
}

}  // namespace

Outcome<Bytes> readInput(const std::string& path) {
  if (path == "-") return readStream(stdin, "standard input");
  std::FILE* file = std::fopen(path.c_str(), "re");
  if (file == nullptr) return Failure{path + ": " + errorText(errno)};
  Outcome<Bytes> bytes = readStream(file, path);
  std::fclose(file);
  return bytes;
}

Outcome<PlistValue> readPlistFile(PropertyListCodec& codec, const std::string& path) {
  const auto bytes = readInput(path);
  if (!bytes) return Failure{bytes.reason()};
  return valueOf(codec.parse(*bytes), path);
}

Outcome<PlistValue> readPlistOrJsonFile(PropertyListCodec& codec, const std::string& path) {
  const auto bytes = readInput(path);
  if (!bytes) return Failure{bytes.reason()};
  const std::string_view text(reinterpret_cast<const char*>(bytes->data()), bytes->size());
  if (looksLikePropertyList(text)) return valueOf(codec.parse(*bytes), path);
  return valueOf(plistFromJson(text), path);
}

}  // namespace tbdaily
