// The health of a drive at this moment, from the storage controller's statistics or the health page of an
// NVMe drive, and what there is to say of it.
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "storage/stats_context.h"
#include "tools/tallyctl/metrics/values.h"

namespace tbdaily {

// What a drive does not say is absent.
struct DriveHealth {
  using Figure = std::optional<std::int64_t>;

  std::string name;  // "storage controller", "nvme0"

  Figure hostRead, hostWritten, flashRead, flashWritten;  // bytes in its life; saturated
  Figure percentUsed;              // of the life that its maker foresees; may go beyond 100
  Figure slcPercentUsed;           // the same for the intermediate partition
  Figure mostErases, leastErases;  // of its most and its least worn block
  Figure intermediateMostErases, intermediateLeastErases;
  Figure powerOnSeconds;
  Figure uncleanShutdowns;
  Figure spare, spareThreshold;  // percent
  Figure freeBlocks, grownBadBlocks;
  Figure lostReads;    // that could not be corrected
  Figure warnings;     // bits, those of an NVMe drive's critical warning
  Figure temperature;  // degrees Celsius

  // What they were read from, by the names that the drive has for it.
  std::vector<std::pair<std::string, std::int64_t>> raw;

  // What the flash wrote for each byte that the host wrote, over its life; none where that is not known.
  std::optional<double> writeAmplification() const;
};

// Each figure with its name in JSON.
struct HealthFigure {
  std::string_view name;
  DriveHealth::Figure DriveHealth::*figure;
};
extern const std::array<HealthFigure, 19> kHealthFigures;

DriveHealth controllerHealth(const StatsContext& context);
// Of the channels of the driver "nvme" with their values; the drives in the order of their channels.
std::vector<DriveHealth> nvmeHealth(const std::vector<ChannelValues>& channels);

// How urgent a finding is.
enum class Urgency : std::uint8_t { Watch, Act };

struct HealthFinding {
  Urgency urgency = Urgency::Watch;
  std::string text;  // one line: what is wrong, and what to do
};

// What is wrong with any of them, the most urgent first; nothing for healthy drives.
std::vector<HealthFinding> findingsOf(const std::vector<DriveHealth>& drives);

// "healthy", "worth watching" or "act now", of all findings together.
std::string_view healthVerdict(const std::vector<HealthFinding>& findings);

}  // namespace tbdaily
