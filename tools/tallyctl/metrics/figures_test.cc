#include "tools/tallyctl/metrics/figures.h"

#include <gtest/gtest.h>

#include <limits>

#include "drivermetrics/kd_report.h"

namespace tbdaily::testing {
namespace {

constexpr std::int64_t kCount = 0, kSeconds = kdreport::kKdReportSeconds, kMicroseconds = 0x0100007900000000,
                       kMicrowatts = 0x0200007900000000, kMicrojoules = 0x0300007900000000,
                       kMillivolts = 0x0500007C00000000, kBytes = 0x0900820000000000,
                       kPages = 0x09008C0000000004, kUnknownTicks = 0x0101000000000000,
                       kMillicelsius = 0x0A00007C00000000, kEvents = 0x6400000000000000,
                       kOther = 0x7700000000000000, kNone = kdreport::kKdReportInvalid;

TEST(FiguresTest, AreSaidAsPeopleSayThem) {
  const struct {
    std::int64_t value, unit;
    const char* said;
  } cases[] = {{999, kCount, ""},
               {999'499, kCount, "999 k"},
               {999'500, kCount, "1.00 M"},
               {-12'345'678, kEvents, "-12.3 M"},
               {250, kMicroseconds, ""},
               {1'500, kMicroseconds, "1.50 ms"},
               {119'000'000, kMicroseconds, "119 s"},
               {119, kSeconds, ""},
               {125, kSeconds, "2 min 5 s"},
               {-11'545, kSeconds, "-3 h 12 min"},
               {460'800, kSeconds, "5 d 8 h"},
               {24'123'456'789, kBytes, "24.1 GB"},
               {1'000, kPages, "4.10 MB"},
               {1'050, kMillivolts, "1.05 V"},
               {42'500, kMillicelsius, "42.5 C"},
               {3'200'000, kMicrowatts, "3.20 W"},
               {std::numeric_limits<std::int64_t>::max(), kBytes, "9.22 EB"},
               {5'000, kUnknownTicks, ""},
               {5'000, kOther, ""},
               {5'000, kNone, ""},
               {kNone, kBytes, ""}};
  for (const auto& [value, unit, said] : cases)
    EXPECT_EQ(humanFigure(value, unit), said) << value << " of " << unit;
}

TEST(FiguresTest, RatesAreWhatTheUnitMakesOfThem) {
  EXPECT_EQ(humanRate(1'234'567, kBytes), "1.23 MB/s");
  EXPECT_EQ(humanRate(0.5, kBytes), "0.50 B/s");
  EXPECT_EQ(humanRate(350'000, kMicroseconds), "35.0 %");
  EXPECT_EQ(humanRate(12'300'000, kMicrojoules), "12.3 W");
  EXPECT_EQ(humanRate(-250, kEvents), "-250/s");
  EXPECT_EQ(humanRate(0, kBytes), "0");
  EXPECT_EQ(humanRate(2'500, kCount), "2.50 k/s");
  for (const std::int64_t unit : {kMillicelsius, kMicrowatts, kOther, kNone})
    EXPECT_EQ(humanRate(5, unit), "");
}

}  // namespace
}  // namespace tbdaily::testing
