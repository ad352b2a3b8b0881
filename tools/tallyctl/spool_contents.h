// What waits in the log spool, and making room there.
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/linux/base/host.h"
#include "platform/plist/json_writer.h"
#include "platform/property_list_codec.h"
#include "tools/tallyctl/outcome.h"

namespace tbdaily {

// A log with its description.
struct SpooledLog {
  std::string folder;  // below the spool: "Pending", or "Outbox/<batch>"
  std::string name;
  std::uint64_t bytes = 0;  // of both files
  PlistDate created{};      // as its description says, else when its file was last written
};

struct SpoolPart {
  std::string_view name;         // "pending"
  std::vector<SpooledLog> logs;  // the oldest first

  std::uint64_t bytes() const;
};

struct SpoolContents {
  std::array<SpoolPart, 3> parts;  // pending, withheld, outbox

  std::uint64_t bytes() const;
};

// A folder that is not there holds nothing; one that cannot be read is a failure.
Outcome<SpoolContents> readSpool(const Host& host, PropertyListCodec& codec);

// {"pending": {"logs", "bytes", "oldest"}, ...}
void writeSpool(JsonWriter& json, const SpoolContents& contents);

struct PruneLimits {
  std::optional<PlistDate> olderThan;    // logs that were created before
  std::optional<std::uint64_t> maximum;  // bytes of all that stays
};
// Which logs have to go, the oldest of all parts first.
std::vector<SpooledLog> logsToPrune(const SpoolContents& contents, const PruneLimits& limits);

// Removes each log, its description after it, and batches that are left empty, while no run changes the
// spool; a log that is gone already is none the less gone. The number of logs that were removed.
Outcome<std::size_t> removeLogs(const Host& host, const std::vector<SpooledLog>& logs);

}  // namespace tbdaily
