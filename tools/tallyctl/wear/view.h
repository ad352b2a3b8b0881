// Wear as a person looks at it: a verdict, then figures; and the days as a table under a small chart.
#pragma once

#include <optional>
#include <vector>

#include "storage/write_amplification.h"
#include "tools/tallyctl/terminal.h"
#include "tools/tallyctl/wear/drive_health.h"
#include "tools/tallyctl/wear/wear_history.h"

namespace tbdaily {

// What the controller's own figures say against the threshold; there where there is a controller.
struct ControllerJudgement {
  WriteAmplification amplification;
  bool isAbove = false;  // the user's figure the threshold
  bool recommendsContentDeletion = false;
};

// What is known of the drives of this moment.
struct WearMoment {
  std::vector<DriveHealth> drives;
  double threshold = 0;  // of the write amplification
  std::optional<ControllerJudgement> controller;
  std::vector<HealthFinding> findings;  // of all drives, the most urgent first
};

void printWear(Terminal& out, const WearMoment& wear);
// The figures by the drives' own names, as they are.
void printRawWear(Terminal& out, const WearMoment& wear);

// `endurance`: the erases that a block is made for, where that is known.
void printWearHistory(Terminal& out, const WearHistory& history, const std::optional<WearPace>& pace,
                      std::optional<std::int64_t> endurance);

// "at the pace of the last 30 days the most worn block meets 3000 erases on 2031-05-02", or why it never
// does.
std::string paceSentence(const WearPace& pace, std::int64_t endurance);

}  // namespace tbdaily
