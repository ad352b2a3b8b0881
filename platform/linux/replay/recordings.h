// Recordings: property lists under System/Device/ of the device root that answer in place of the live host.
#pragma once

#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>

#include "platform/linux/base/cached_plist_file.h"
#include "platform/linux/base/file_io.h"
#include "platform/linux/base/host.h"
#include "platform/property_list_codec.h"

namespace tbdaily {

class Recordings {
 public:
  Recordings(const Host& host, PropertyListCodec& codec) : host_(host), codec_(codec) {}

  // The recording's root dictionary; an empty one when it is missing or cannot be parsed (which is named once
  // on standard error). A file that changed since the last call is read again.
  PlistValue load(std::string_view file);

  // An entry of the recording's root, or none.
  PlistValue entry(std::string_view file, std::string_view key);

  // The same; nullopt when the recording is there and cannot be read for now.
  std::optional<PlistValue> readableEntry(std::string_view file, std::string_view key);

  // The bytes of a file below System/Device/; false when it cannot be read (named once) or does not lie
  // there.
  bool readFile(std::string_view file, FileContents& contents);

  bool has(std::string_view file) const;
  // The path of a file under System/Device/.
  static std::string path(std::string_view file);

 private:
  // Under the mutex.
  const CachedPlistFile& loaded(std::string_view file);

  const Host& host_;
  PropertyListCodec& codec_;
  std::mutex mutex_;  // a usage reply is processed on a thread of its own
  std::map<std::string, CachedPlistFile, std::less<>> loaded_;
};

namespace recording {
inline constexpr std::string_view kFolder = "/System/Device";
inline constexpr std::string_view kClock = "clock.plist";
inline constexpr std::string_view kAnswers = "answers.plist";
inline constexpr std::string_view kKernel = "kernel.plist";
inline constexpr std::string_view kApps = "apps.plist";
inline constexpr std::string_view kLocale = "locale.plist";
inline constexpr std::string_view kUsage = "usage.plist";
inline constexpr std::string_view kRegistry = "registry.plist";
inline constexpr std::string_view kHub = "hub.plist";
inline constexpr std::string_view kNvme = "nvme.plist";
inline constexpr std::string_view kStackSnapshot = "snapshot.kcdata";
}  // namespace recording

}  // namespace tbdaily
