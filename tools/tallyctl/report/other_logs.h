// The other logs: those that wait beside the report, and those that the next run would write.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "platform/linux/linux_platform.h"
#include "tools/tallyctl/outcome.h"

namespace tbdaily {

struct OtherLog {
  enum class State : std::uint8_t { Waits, WouldBeWritten, WouldBeMoved };

  State state = State::Waits;
  std::string name;  // of the file, below the spool; of one that would be written what it is
  std::uint64_t bytes = 0;
};

// Those that wait in Pending/ and Outbox/; what the job's own code would write beside the report at this
// moment (the NAND log); structured data of earlier days. Changes nothing.
Outcome<std::vector<OtherLog>> otherLogs(LinuxPlatform& platform);

}  // namespace tbdaily
