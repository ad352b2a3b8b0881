// Preferences: one property list for each domain, var/mobile/Library/Preferences/<domain>.plist.
//
// Readers never wait and never meet half a file. Writers take turns on <domain>.plist.lock, so that no update
// is lost between processes. A file that cannot be parsed reads as empty and is moved aside, never
// overwritten, at the next write.
#pragma once

#include <map>
#include <mutex>
#include <string>

#include "platform/linux/base/cached_plist_file.h"
#include "platform/linux/base/host.h"
#include "platform/preferences_store.h"
#include "platform/property_list_codec.h"

namespace tbdaily {

class LinuxPreferences : public PreferencesStore {
 public:
  LinuxPreferences(const Host& host, PropertyListCodec& codec) : host_(host), codec_(codec) {}

  PlistValue getValue(std::string_view key, std::string_view domain) override;
  void setValue(std::string_view key, const PlistValue& value, std::string_view domain) override;
  // Writes each domain once. A value that no file can hold is left out and named.
  std::vector<std::string> applyChanges(std::span<const PreferenceChange> changes) override;
  void synchronize(std::string_view domain) override;

  static constexpr std::string_view kFolder = "/var/mobile/Library/Preferences";

 private:
  static bool acceptsDomain(std::string_view domain);
  static std::string path(std::string_view domain);
  // The domain as its file stands now; parsed anew only when the file changed.
  CachedPlistFile& current(std::string_view domain);
  struct Change {
    std::string_view key;
    PlistValue value;  // none removes the key
  };
  // A read-modify-write of the domain's file, under its lock. False when another time may do better.
  bool changeDomain(std::string_view name, std::span<const Change> changes);
  static PlistDictionary changed(PlistDictionary values, std::span<const Change> changes);
  // The file's contents after the changes; empty when they cannot be written.
  std::string bytesOf(std::string_view name, const PlistDictionary& stored, std::span<const Change> changes);
  bool isWritable(const Change& change, std::string_view name);
  // Whether the file is as this process put it there.
  bool isStored(std::string_view name, const FileIdentity& file);
  static bool moveAside(const DeviceFolder& folder, const std::string& file);

  const Host& host_;
  PropertyListCodec& codec_;
  std::mutex mutex_;  // over what follows: a usage reply is processed on a thread of its own
  std::map<std::string, CachedPlistFile, std::less<>> domains_;
  // The files that this process put in place last: their contents are on storage, if not yet their names.
  std::map<std::string, FileIdentity, std::less<>> stored_;
};

}  // namespace tbdaily
