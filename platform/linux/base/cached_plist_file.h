// A property-list file that is parsed anew only when it changed.
#pragma once

#include <string>

#include "platform/linux/base/device_files.h"
#include "platform/plist_value.h"
#include "platform/property_list_codec.h"

namespace tbdaily {

class CachedPlistFile {
 public:
  enum class State { Missing, Readable, Damaged, Unreadable };

  // Looks at the file of the device as it stands now.
  void refresh(const DeviceFiles& files, const std::string& path, PropertyListCodec& codec);
  // The next look reads the file, whatever became of it meanwhile.
  void forget() { identity_ = {}; }

  State state() const { return state_; }
  // A dictionary; an empty one unless the file is readable.
  const PlistValue& root() const { return root_; }
  // One line, of a file that is damaged or cannot be read.
  const std::string& fault() const { return fault_; }
  // Unreadable for want of memory, which says nothing about the file.
  bool ranOutOfMemory() const { return ranOutOfMemory_; }

 private:
  void read(const DeviceFiles& files, const std::string& path, PropertyListCodec& codec);

  FileIdentity identity_;  // that of no file: read again
  State state_ = State::Missing;
  PlistValue root_ = PlistValue::dictionary({});
  std::string fault_;
  bool ranOutOfMemory_ = false;
};

}  // namespace tbdaily
