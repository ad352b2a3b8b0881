#include "tools/tallyctl/wear/drive_health.h"

#include <gtest/gtest.h>

namespace tbdaily {
namespace {

ChannelValues channel(const std::string& name, std::int64_t value) {
  ChannelValues values;
  values.name = name;
  values.value = value;
  return values;
}

std::string findings(const DriveHealth& health) {
  std::string all;
  for (const HealthFinding& finding : findingsOf({health}))
    all += (finding.urgency == Urgency::Act ? "! " : "? ") + finding.text.substr(0, 40) + "\n";
  return all;
}

TEST(DriveHealth, IsReadFromTheChannelsOfEachNvmeDrive) {
  const auto drives = nvmeHealth({channel("nvme0.percentUsed", 3), channel("nvme0.writtenBytes", 512'000),
                                  channel("nvme1.percentUsed", 120), channel("odd", 1),
                                  channel("nvme1.temperature", kdreport::kKdReportInvalid)});
  ASSERT_EQ(drives.size(), 2U);
  EXPECT_EQ(drives[0].hostWritten, 512'000);
  EXPECT_EQ(drives[0].writeAmplification(), std::nullopt);
  EXPECT_EQ(drives[1].percentUsed, 120);
  EXPECT_EQ(drives[1].temperature, std::nullopt);
}

TEST(DriveHealth, ADriveWithoutTroublesIsHealthy) {
  DriveHealth health;
  EXPECT_EQ(healthVerdict(findingsOf({health})), "healthy");
  health.percentUsed = 79;
  health.spare = 10;
  health.spareThreshold = 10;
  health.warnings = 0;
  EXPECT_EQ(findings(health), "");
}

TEST(DriveHealth, WhatIsWrongIsNamedTheMostUrgentFirst) {
  DriveHealth health;
  health.lostReads = 3;
  health.percentUsed = 80;
  health.spare = 9;
  health.spareThreshold = 10;
  EXPECT_EQ(findings(health),
            "! 9 % of its spare are left, fewer than 10\n"
            "? 80 % of the life that its maker foresees\n"
            "? 3 reads could not be corrected: see that\n");
  EXPECT_EQ(healthVerdict(findingsOf({health})), "act now");
  health.spareThreshold = 5;
  EXPECT_EQ(healthVerdict(findingsOf({health})), "worth watching");
  health = {};
  health.slcPercentUsed = 100;
  health.warnings = 1 | 8 | 64;
  health.spare = 0;
  health.spareThreshold = 10;
  EXPECT_EQ(findings(health),
            "! it has too little spare left: replace it\n"
            "! it can only be read any more: replace it\n"
            "! it warns of something that has no name h\n"
            "! 100 % of the life that its maker foresee\n");
}

}  // namespace
}  // namespace tbdaily
