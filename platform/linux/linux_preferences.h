// Preferences: one property list for each domain, var/mobile/Library/Preferences/<domain>.plist.
//
// Readers never wait and never meet half a file. Writers take turns on <domain>.plist.lock, so that no update
// is lost between processes. A file that cannot be parsed reads as empty and is moved aside, never
// overwritten, at the next write.
#pragma once

#include <map>
#include <optional>
#include <string>

#include "platform/linux/file_io.h"
#include "platform/linux/host.h"
#include "platform/preferences_store.h"
#include "platform/property_list_codec.h"

namespace tbdaily {

class LinuxPreferences : public PreferencesStore {
 public:
  LinuxPreferences(const Host& host, PropertyListCodec& codec) : host_(host), codec_(codec) {}

  PlistValue getValue(std::string_view key, std::string_view domain) override;
  void setValue(std::string_view key, const PlistValue& value, std::string_view domain) override;
  void synchronize(std::string_view domain) override;

  std::filesystem::path folder() const;

 private:
  enum class FileState { Readable, Missing, Damaged, Unreadable };
  struct Domain {
    std::optional<FileIdentity> identity;
    FileState state = FileState::Missing;
    PlistValue values = PlistValue::dictionary({});
  };

  static bool acceptsDomain(std::string_view domain);
  std::filesystem::path file(std::string_view domain) const;
  // The domain as its file stands now; parsed anew only when the file changed.
  Domain& current(std::string_view domain);
  void read(const std::filesystem::path& place, Domain& domain);
  bool store(std::string_view name, Domain& domain, const PlistDictionary& values);
  static bool moveAside(const std::filesystem::path& place);

  const Host& host_;
  PropertyListCodec& codec_;
  std::map<std::string, Domain, std::less<>> domains_;
};

}  // namespace tbdaily
