#include "platform/linux/linux_system_log.h"

#include <errno.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include "platform/linux/host_test_support.h"
#include "platform/platform.h"
#include "platform/system_log.h"

namespace tbdaily {
namespace {

using testing::TestPlatform;
constexpr double kNow = 1795511224.99951171875;

TEST(LinuxSystemLogTest, WritesLinesThatStayLines) {
  TestPlatform device;
  device.setClock(kNow);
  const auto write = [&] {
    LinuxPlatform platform(device.host);
    SystemLog& log = platform.services().systemLog;
    log.message(LogLevel::Default, "day %d of %s", 20780, "text");
    log.message(LogLevel::Info, "%{public}@ and %@", PlistValue::string("a\nb"), PlistValue::boolean(true));
    log.message(LogLevel::Debug, "debug");
    log.message(LogLevel::Error, "100%%%{public}@", PlistValue::string("\x1b[2J\r\u009b\t\u00e4"));
    log.writePlain("plain %d\n");
  };
  const std::string start = "2026-11-24T09:07:04.999511Z " + std::string(program_invocation_short_name) +
                            "[" + std::to_string(::getpid()) + "] ";
  const std::string end =
      start + "error: 100%\\x1b[2J\\x0d\\x9b\t\u00e4\n" + start + "default: plain %d\n\t\n";
  write();
  const std::string lines =
      start + "default: day 20780 of <private>\n" + start + "info: a\n\tb and <private>\n" + end;
  EXPECT_EQ(device.text("/var/log/tbdaily.log"), lines);

  ::setenv("TBDAILY_LOG", "stderr", 1);
  ::setenv("JOURNAL_STREAM", "8:1", 1);
  ::testing::internal::CaptureStderr();
  write();
  EXPECT_EQ(::testing::internal::GetCapturedStderr(),
            "<5>" + start + "default: day 20780 of <private>\n<6>" + start +
                "info: a\n<6>\tb and <private>\n<3>" + start + "error: 100%\\x1b[2J\\x0d\\x9b\t\u00e4\n<5>" +
                start + "default: plain %d\n<5>\t\n");
  ::unsetenv("TBDAILY_LOG");
  ::unsetenv("JOURNAL_STREAM");

  device.record("answers.plist", "InternalBuild", PlistValue::boolean(true));
  ::setenv("TBDAILY_LOG_DEBUG", "1", 1);
  write();
  ::unsetenv("TBDAILY_LOG_DEBUG");
  EXPECT_EQ(device.text("/var/log/tbdaily.log"), lines + start + "default: day 20780 of text\n" + start +
                                                     "info: a\n\tb and 1\n" + start + "debug: debug\n" + end);
}

}  // namespace
}  // namespace tbdaily
