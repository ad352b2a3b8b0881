#include "tools/tallyctl/input_file.h"

#include <array>
#include <cerrno>
#include <cstdio>
#include <string_view>

#include "platform/linux/base/file_io.h"
#include "platform/linux/base/host_notes.h"
#include "platform/plist/json.h"

namespace tbdaily {

namespace {

using Bytes = std::vector<std::byte>;

Outcome<Bytes> readStandardInput(std::size_t maximumSize) {
  const std::string name = "standard input";
  Bytes bytes;
  std::array<std::byte, 65536> chunk;
  while (const std::size_t count = std::fread(chunk.data(), 1, chunk.size(), stdin)) {
    if (count > maximumSize - bytes.size()) return inputFailure(name, EFBIG, maximumSize);
    bytes.insert(bytes.end(), chunk.begin(), chunk.begin() + static_cast<std::ptrdiff_t>(count));
  }
  if (std::ferror(stdin) != 0) return inputFailure(name, errno, maximumSize);
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

Failure inputFailure(const std::string& path, int error, std::size_t maximumSize) {
  if (error == EFBIG) return {path + ": it is larger than " + std::to_string(maximumSize >> 20) + " MiB"};
  return {path + ": " + errorText(error)};
}

Outcome<Bytes> readInput(const std::string& path, std::size_t maximumSize) {
  if (path == "-") return readStandardInput(maximumSize);
  FileContents contents;
  if (const int error = readHostFile(path, contents, maximumSize); error != 0)
    return inputFailure(path, error, maximumSize);
  return std::move(contents.bytes);
}

Outcome<PlistValue> readPlistFile(PropertyListCodec& codec, const std::string& path) {
  const auto bytes = readInput(path, kLargestPlistInput);
  if (!bytes) return Failure{bytes.reason()};
  return valueOf(codec.parse(*bytes), path);
}

Outcome<PlistValue> readPlistOrJsonFile(PropertyListCodec& codec, const std::string& path) {
  const auto bytes = readInput(path, kLargestPlistInput);
  if (!bytes) return Failure{bytes.reason()};
  const std::string_view text(reinterpret_cast<const char*>(bytes->data()), bytes->size());
  if (looksLikePropertyList(text)) return valueOf(codec.parse(*bytes), path);
  return valueOf(plistFromJson(text), path);
}

}  // namespace tbdaily
