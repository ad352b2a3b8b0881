#include "tools/tallyctl/input_file.h"

#include <array>
#include <cerrno>
#include <cstdio>
#include <string_view>

#include "platform/linux/host_notes.h"
#include "platform/plist/json.h"

namespace tbdaily {

namespace {

// Pipes too, so that the shell's substitutions work.
InputFile readStream(std::FILE* stream, const std::string& name) {
  InputFile input;
  std::array<std::byte, 65536> chunk;
  while (const std::size_t count = std::fread(chunk.data(), 1, chunk.size(), stream)) {
    input.bytes.insert(input.bytes.end(), chunk.begin(), chunk.begin() + static_cast<std::ptrdiff_t>(count));
  }
  if (std::ferror(stream) != 0) input.error = name + ": " + errorText(errno);
  return input;
}

PlistParseResult withFileName(PlistParseResult result, const std::string& path) {
  if (!result.error.empty()) result.error = path + ": " + result.error;
  return result;
}

bool looksLikePropertyList(std::string_view text) {
  const std::size_t first = text.find_first_not_of(" \t\r\n\xef\xbb\xbf");
  return text.starts_with("bplist") || (first != std::string_view::npos && text[first] == '<');
}

}  // namespace

InputFile readInput(const std::string& path) {
  if (path == "-") return readStream(stdin, "standard input");
  std::FILE* file = std::fopen(path.c_str(), "re");
  if (file == nullptr) return {{}, path + ": " + errorText(errno)};
  InputFile input = readStream(file, path);
  std::fclose(file);
  return input;
}

PlistParseResult readPlistFile(PropertyListCodec& codec, const std::string& path) {
  const InputFile input = readInput(path);
  if (!input.error.empty()) return {{}, input.error};
  return withFileName(codec.parse(input.bytes), path);
}

PlistParseResult readPlistOrJsonFile(PropertyListCodec& codec, const std::string& path) {
  const InputFile input = readInput(path);
  if (!input.error.empty()) return {{}, input.error};
  const std::string_view text(reinterpret_cast<const char*>(input.bytes.data()), input.bytes.size());
  if (looksLikePropertyList(text)) return withFileName(codec.parse(input.bytes), path);
  PlistJsonResult json = plistFromJson(text);
  return withFileName({std::move(json.value), std::move(json.error)}, path);
}

}  // namespace tbdaily
