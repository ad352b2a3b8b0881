// The health of a drive at this moment: from the storage controller's statistics, or from the health page of
// an NVMe drive. What a drive does not say is absent.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace tbdaily {

struct DriveHealth {
  std::string name;  // "storage controller", "nvme0"

  std::optional<double> hostRead, hostWritten, flashRead, flashWritten;  // bytes in its life
  std::optional<double> writeAmplification;  // what the flash wrote for each byte that the host wrote
  std::optional<std::int64_t> percentUsed;   // of the life that its maker foresees; may go beyond 100
  std::optional<std::int64_t> slcPercentUsed;
  std::optional<std::int64_t> mostErases, leastErases;  // of the user's partition's blocks
  std::optional<std::int64_t> intermediateMostErases, intermediateLeastErases;
  std::optional<std::int64_t> powerOnSeconds;
  std::optional<std::int64_t> uncleanShutdowns;
  std::optional<std::int64_t> spare, spareThreshold;  // percent
  std::optional<std::int64_t> freeBlocks, grownBadBlocks;
  std::optional<std::int64_t> lostReads;    // that could not be corrected
  std::optional<std::int64_t> warnings;     // bits of NvmeWarning
  std::optional<std::int64_t> temperature;  // degrees Celsius
  bool recommendsContentDeletion = false;
};

// How urgent a finding is.
enum class Urgency : std::uint8_t { Watch, Act };

struct HealthFinding {
  Urgency urgency = Urgency::Watch;
  std::string text;  // one line: what is wrong, and what to do
};

// What is wrong, the most urgent first; nothing for a healthy drive.
std::vector<HealthFinding> healthFindings(const DriveHealth& health);

// "healthy", "worth watching" or "act now", of all findings together.
std::string_view healthVerdict(const std::vector<HealthFinding>& findings);

}  // namespace tbdaily
