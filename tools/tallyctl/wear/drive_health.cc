#include "tools/tallyctl/wear/drive_health.h"

#include <algorithm>
#include <limits>

#include "drivermetrics/kd_report.h"
#include "tools/tallyctl/wear/wear_history.h"

namespace tbdaily {

constinit const std::array<HealthFigure, 19> kHealthFigures{{
    {"hostReadBytes", &DriveHealth::hostRead},
    {"hostWrittenBytes", &DriveHealth::hostWritten},
    {"flashReadBytes", &DriveHealth::flashRead},
    {"flashWrittenBytes", &DriveHealth::flashWritten},
    {"percentUsed", &DriveHealth::percentUsed},
    {"slcPercentUsed", &DriveHealth::slcPercentUsed},
    {"mostErases", &DriveHealth::mostErases},
    {"leastErases", &DriveHealth::leastErases},
    {"intermediateMostErases", &DriveHealth::intermediateMostErases},
    {"intermediateLeastErases", &DriveHealth::intermediateLeastErases},
    {"powerOnSeconds", &DriveHealth::powerOnSeconds},
    {"uncleanShutdowns", &DriveHealth::uncleanShutdowns},
    {"sparePercent", &DriveHealth::spare},
    {"spareThresholdPercent", &DriveHealth::spareThreshold},
    {"freeBlocks", &DriveHealth::freeBlocks},
    {"grownBadBlocks", &DriveHealth::grownBadBlocks},
    {"lostReads", &DriveHealth::lostReads},
    {"warnings", &DriveHealth::warnings},
    {"temperature", &DriveHealth::temperature},
}};

namespace {

constexpr std::int64_t kMost = std::numeric_limits<std::int64_t>::max();
constexpr std::int64_t kHour = 3600;
constexpr std::int64_t kMuchUsed = 80, kUsedUp = 100;  // percent

// What a statistic of the controller, or a channel of an NVMe drive, says.
struct Source {
  std::string_view name;
  DriveHealth::Figure DriveHealth::*figure;
  std::int64_t factor = 1;
};

constexpr Source kStatistics[] = {
    {"hostReads", &DriveHealth::hostRead, kWearSectorBytes},
    {"hostWrites", &DriveHealth::hostWritten, kWearSectorBytes},
    {"nandReads", &DriveHealth::flashRead, kWearSectorBytes},
    {"nandWrites", &DriveHealth::flashWritten, kWearSectorBytes},
    {"percentUsed", &DriveHealth::percentUsed},
    {"slcPercentUsed", &DriveHealth::slcPercentUsed},
    {"hottestCycle0", &DriveHealth::mostErases},
    {"coldestCycle0", &DriveHealth::leastErases},
    {"hottestCycle1", &DriveHealth::intermediateMostErases},
    {"coldestCycle1", &DriveHealth::intermediateLeastErases},
    {"powerOnHours", &DriveHealth::powerOnSeconds, kHour},
    {"powerOnSeconds", &DriveHealth::powerOnSeconds},  // behind the hours, which it makes exact
    {"uncleanBoots", &DriveHealth::uncleanShutdowns},
    {"numFreeVirtualBlocks", &DriveHealth::freeBlocks},
    {"numGrownBad", &DriveHealth::grownBadBlocks},
    {"ueccReads", &DriveHealth::lostReads},
    {"smartCritWarnings", &DriveHealth::warnings},
    // Shown raw alone.
    {"maxHighEnduranceBlockErases", nullptr},
    {"bandErases", nullptr},
    {"intermediateBandErases", nullptr},
};

constexpr Source kChannels[] = {
    {"criticalWarning", &DriveHealth::warnings},      {"availableSpare", &DriveHealth::spare},
    {"spareThreshold", &DriveHealth::spareThreshold}, {"percentUsed", &DriveHealth::percentUsed},
    {"temperature", &DriveHealth::temperature},       {"readBytes", &DriveHealth::hostRead},
    {"writtenBytes", &DriveHealth::hostWritten},      {"unsafeShutdowns", &DriveHealth::uncleanShutdowns},
    {"mediaErrors", &DriveHealth::lostReads},         {"powerOnTime", &DriveHealth::powerOnSeconds},
};

struct Warning {
  std::int64_t bit;
  std::string_view text;
};
constexpr Warning kWarnings[] = {
    {1 << 0, "it has too little spare left: replace it"},
    {1 << 1, "it is too hot or too cold: see to its cooling"},
    {1 << 2, "it has become unreliable: replace it"},
    {1 << 3, "it can only be read any more: replace it"},
    {1 << 4, "the backup of its memory has failed: what it has in hand is lost with the power"},
    {1 << 5, "its persistent memory can only be read any more: replace it"},
};

std::int64_t scaled(std::uint64_t value, std::int64_t factor) {
  const auto limit = static_cast<std::uint64_t>(kMost / factor);
  return value > limit ? kMost : static_cast<std::int64_t>(value) * factor;
}

class Findings {
 public:
  // `where` comes before each finding.
  Findings(const DriveHealth& health, std::string where) : health_(health), where_(std::move(where)) {}

  std::vector<HealthFinding> take() {
    judgeWarnings();
    judgeLife();
    if (health_.spare && health_.spareThreshold && *health_.spare < *health_.spareThreshold &&
        (health_.warnings.value_or(0) & 1) == 0)
      say(Urgency::Act, std::to_string(*health_.spare) + " % of its spare are left, fewer than " +
                            std::to_string(*health_.spareThreshold) + " %: replace it");
    if (health_.lostReads.value_or(0) > 0)
      say(Urgency::Watch,
          std::to_string(*health_.lostReads) + " reads could not be corrected: see that there is a backup");
    return std::move(found_);
  }

 private:
  void say(Urgency urgency, const std::string& text) { found_.push_back({urgency, where_ + text}); }
  void judgeWarnings() {
    std::int64_t rest = health_.warnings.value_or(0);
    for (const Warning& warning : kWarnings) {
      if ((rest & warning.bit) == 0) continue;
      say(Urgency::Act, std::string(warning.text));
      rest &= ~warning.bit;
    }
    if (rest != 0)
      say(Urgency::Act, "it warns of something that has no name here (bits " + std::to_string(rest) + ")");
  }
  void judgeLife() {
    const std::int64_t used = std::max(health_.percentUsed.value_or(0), health_.slcPercentUsed.value_or(0));
    if (used < kMuchUsed) return;
    const std::string percent = std::to_string(used) + " % of the life that its maker foresees are used";
    if (used >= kUsedUp)
      say(Urgency::Act, percent + ": replace it");
    else
      say(Urgency::Watch, percent + ": plan its replacement");
  }

  const DriveHealth& health_;
  const std::string where_;
  std::vector<HealthFinding> found_;
};

}  // namespace

std::optional<double> DriveHealth::writeAmplification() const {
  if (!flashWritten || hostWritten.value_or(0) <= 0) return std::nullopt;
  return static_cast<double>(*flashWritten) / static_cast<double>(*hostWritten);
}

DriveHealth controllerHealth(const StatsContext& context) {
  DriveHealth health;
  health.name = "storage controller";
  for (const Source& source : kStatistics) {
    for (const StatNode& node : context.nodes) {
      if (!node.isNamed(source.name)) continue;
      if (source.figure != nullptr) health.*source.figure = scaled(node.value, source.factor);
      health.raw.emplace_back(source.name, static_cast<std::int64_t>(node.value));
    }
  }
  return health;
}

std::vector<DriveHealth> nvmeHealth(const std::vector<ChannelValues>& channels) {
  std::vector<DriveHealth> drives;
  for (const ChannelValues& channel : channels) {
    const std::string_view name = channel.name ? std::string_view(*channel.name) : std::string_view();
    const std::size_t dot = name.find('.');
    if (dot == std::string_view::npos || channel.value == kdreport::kKdReportInvalid) continue;
    const std::string_view drive = name.substr(0, dot);
    if (drives.empty() || drives.back().name != drive) drives.emplace_back().name = drive;
    drives.back().raw.emplace_back(name.substr(dot + 1), channel.value);
    for (const Source& source : kChannels) {
      if (source.name == name.substr(dot + 1)) drives.back().*source.figure = channel.value;
    }
  }
  return drives;
}

std::vector<HealthFinding> findingsOf(const std::vector<DriveHealth>& drives) {
  std::vector<HealthFinding> urgent, others;
  for (const DriveHealth& drive : drives) {
    for (HealthFinding& finding : Findings(drive, drives.size() > 1 ? drive.name + ": " : "").take())
      (finding.urgency == Urgency::Act ? urgent : others).push_back(std::move(finding));
  }
  urgent.insert(urgent.end(), others.begin(), others.end());
  return urgent;
}

std::string_view healthVerdict(const std::vector<HealthFinding>& findings) {
  if (findings.empty()) return "healthy";
  const bool isUrgent = std::any_of(findings.begin(), findings.end(),
                                    [](const HealthFinding& f) { return f.urgency == Urgency::Act; });
  return isUrgent ? "act now" : "worth watching";
}

}  // namespace tbdaily
