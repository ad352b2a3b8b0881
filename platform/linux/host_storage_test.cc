// What the host layer writes: preferences, the log spool, notifications, the system log.
#include <errno.h>  // program_invocation_short_name
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <thread>

#include "platform/linux/host_test_support.h"
#include "platform/linux/linux_notifications.h"
#include "platform/linux/linux_preferences.h"
#include "platform/linux/log_spool.h"
#include "platform/plist_text.h"
#include "platform/system_log.h"

namespace tbdaily {
namespace {

namespace fs = std::filesystem;
using namespace std::string_literals;
using testing::TestHost;
using testing::TestPlatform;
using Names = std::vector<std::string>;

constexpr double kNow = 1795511224.99951171875;
const PlistDate kDate = PlistDate::fromUnixSeconds(kNow);
constexpr const char* kPreferences = "/var/mobile/Library/Preferences/";
constexpr const char* kLogs = "/var/mobile/Library/Logs/";

class PreferencesTest : public ::testing::Test {
 protected:
  std::string path(const char* name) { return std::string(kPreferences) + name; }
  TestHost device;
  LinuxPreferences preferences{device.host, device.codec};
};

TEST_F(PreferencesTest, LoseNoUpdateBetweenThreadsAndProcesses) {
  constexpr int kWriters = 3, kRounds = 40;
  const auto write = [this](int writer) {
    LinuxPreferences own(device.host, device.codec);
    const std::string key = "writer " + std::to_string(writer);
    for (int round = 1; round <= kRounds; ++round) {
      own.setValue(key, PlistValue::int64(own.getInteger(key, "d") + 1), "d");
      own.setValue(key + " passing", round % 2 == 0 ? PlistValue() : PlistValue::boolean(true), "d");
    }
  };
  const pid_t process = ::fork();
  if (process == 0) {
    write(0);
    ::_exit(0);
  }
  std::thread second(write, 1), third(write, 2);
  second.join();
  third.join();
  ASSERT_EQ(::waitpid(process, nullptr, 0), process);
  for (int writer = 0; writer < kWriters; ++writer) {
    const std::string key = "writer " + std::to_string(writer);
    EXPECT_EQ(preferences.getInteger(key, "d"), kRounds) << key;
    EXPECT_TRUE(preferences.getValue(key + " passing", "d").isNone());
  }
  EXPECT_EQ(device.names(kPreferences), (Names{"d.plist", "d.plist.lock"}));
}

TEST_F(PreferencesTest, MoveDamagedFilesAsideAndNeverOverwriteThem) {
  for (const char* damaged : {"<plist><dict><key>k", "", "<plist><array/></plist>"}) {
    device.put(path("d.plist"), damaged);
    EXPECT_TRUE(preferences.getValue("k", "d").isNone());
    EXPECT_EQ(device.text(path("d.plist")), damaged);
    preferences.setValue("k", PlistValue::int64(1), "d");
    EXPECT_EQ(preferences.getInteger("k", "d"), 1);
  }
  EXPECT_EQ(device.text(path("d.plist.damaged-0")), "<plist><dict><key>k");
  EXPECT_EQ(device.text(path("d.plist.damaged-2")), "<plist><array/></plist>");
  fs::create_directories(device.host.devicePath(path("folder.plist")));
  preferences.setValue("k", PlistValue::int64(1), "folder");
  EXPECT_TRUE(preferences.getValue("k", "folder").isNone());
  EXPECT_TRUE(fs::is_directory(device.host.devicePath(path("folder.plist"))));
  // XML has no such character.
  preferences.applyChanges(std::vector<PreferenceChange>{{"k", PlistValue::string("\x01"), "d"},
                                                         {"n", PlistValue::int64(2), "d"}});
  EXPECT_EQ(preferences.getInteger("k", "d"), 1);
  EXPECT_EQ(preferences.getInteger("n", "d"), 2);
}

TEST_F(PreferencesTest, TouchNoFileForAHostileDomain) {
  device.put("/var/mobile/Library/secret.plist", "x");
  for (const std::string& domain :
       {"../secret"s, "a/b"s, ".hidden"s, ""s, std::string(201, 'a'), "a b"s, "a\0b"s, "\xC3\xA9"s, ".."s}) {
    preferences.setValue("k", PlistValue::int64(1), domain);
    preferences.synchronize(domain);
    EXPECT_TRUE(preferences.getValue("k", domain).isNone());
  }
  preferences.setValue("k", PlistValue(), "absent");
  EXPECT_EQ(device.names("/var/mobile/Library"), Names{"secret.plist"});
  preferences.setValue("k", PlistValue::int64(1), std::string(200, 'a'));
  EXPECT_EQ(preferences.getInteger("k", std::string(200, 'a')), 1);
}

TEST_F(PreferencesTest, ReadFilesOfOthersAndWriteTheExactForm) {
  device.put(path("d.plist"), "<plist><dict><key>k</key><integer>8</integer></dict></plist>");
  EXPECT_EQ(preferences.getValue("k", "d"), PlistValue::int64(8));
  preferences.setValue("date", PlistValue(PlistDate{0.5}), "d");
  preferences.setValue("n", PlistValue::int8(3), "d");
  preferences.setValue("k", PlistValue(), "d");
  EXPECT_NE(device.text(path("d.plist")).find("<integer bits=\"8\">3</integer>"), std::string::npos);
  EXPECT_EQ(plistText(device.parse(device.text(path("d.plist")))),
            R"({"date": 2001-01-01 00:00:00 +0000, "n": 3})");
}

class SpoolTest : public ::testing::Test {
 protected:
  bool write(const char* name, bool whole = true, double at = kNow) {
    return spool.writePending("165", name, {}, PlistDate::fromUnixSeconds(at), [&](LogOutput& output) {
      return output.write(std::as_bytes(std::span("text", 4))) && whole;
    });
  }
  Names names(const char* folder) { return device.names(std::string(kLogs) + folder); }
  std::string text(const std::string& file) { return device.text(kLogs + file); }
  void put(const std::string& file, std::string_view contents) { device.put(kLogs + file, contents); }
  TestHost device;
  LogSpool spool{device.host, device.codec};
};

TEST_F(SpoolTest, NumbersLogsAndClearsWhatADeadWriterLeft) {
  put("Pending/.tmp-abcdef", "half");
  put("Pending/log-2026-11-24-090704-0.165.meta.plist", "its log never came");
  put("Pending/log-2026-11-24-090704-1.165", "a log of somebody else");
  EXPECT_TRUE(write("log"));
  EXPECT_FALSE(write("log", false));
  EXPECT_TRUE(write("log"));
  EXPECT_FALSE(write("../log"));
  EXPECT_EQ(names("Pending"), (Names{"log-2026-11-24-090704-0.165", "log-2026-11-24-090704-0.165.meta.plist",
                                     "log-2026-11-24-090704-1.165", "log-2026-11-24-090704-2.165",
                                     "log-2026-11-24-090704-2.165.meta.plist"}));
  EXPECT_EQ(text("Pending/log-2026-11-24-090704-1.165"), "a log of somebody else");
  EXPECT_EQ(plistText(device.parse(text("Pending/log-2026-11-24-090704-0.165.meta.plist"))),
            R"({"type": "165", "name": "log", "created": 2026-11-24 09:07:04 +0000})");
}

TEST_F(SpoolTest, TakesNothingWhereItCannotWrite) {
  put("Pending", "a file in the folder's place");
  put("Structured", "");
  put("Carewell", "");
  EXPECT_FALSE(write("log"));
  spool.appendStructured(172, {}, kDate);
  spool.dumpOldStructured(kDate);
  spool.submitPending(kDate);
  spool.rollCarewell();
  EXPECT_EQ(text("Pending"), "a file in the folder's place");
}

TEST_F(SpoolTest, WritesStructuredLinesWholeOrNotAtAll) {
  const PlistDictionary data{{"z", PlistValue::int64(-1)}, {"a", PlistValue(kDate)}};
  const std::string line =
      "{\"time\": \"2026-11-24T09:07:04.999Z\", \"data\": {\"z\": -1, \"a\": "
      "\"2026-11-24T09:07:04.9995117Z\"}}\n";
  spool.appendStructured(172, data, kDate);
  EXPECT_EQ(text("Structured/172/2026-11-24.jsonl"), line);
  spool.appendStructured(172, data, kDate);

  {
    const testing::ResourceLimit full(RLIMIT_FSIZE, 2 * line.size() + 30);  // in the middle of a line
    spool.appendStructured(172, data, kDate);
  }
  spool.appendStructured(172, {}, PlistDate::fromUnixSeconds(kNow - 4));
  EXPECT_EQ(text("Structured/172/2026-11-24.jsonl"),
            line + line + "{\"time\": \"2026-11-24T09:07:00.999Z\", \"data\": {}}\n");
}

TEST_F(SpoolTest, DumpsOldDaysUnderNamesOfTheirOwn) {
  for (const char* file : {"172/2026-11-22.jsonl", "172/2026-11-23.jsonl", "176/2026-11-23.jsonl",
                           "172/2026-11-24.jsonl", "172/notes.txt"})
    put(std::string("Structured/") + file, file);
  put("Pending/structured-172-2026-11-23.jsonl", "waits");
  spool.dumpOldStructured(kDate);
  EXPECT_EQ(names("Pending"), (Names{"structured-172-2026-11-22.jsonl", "structured-172-2026-11-23-1.jsonl",
                                     "structured-172-2026-11-23.jsonl", "structured-176-2026-11-23.jsonl"}));
  EXPECT_EQ(text("Pending/structured-172-2026-11-23.jsonl"), "waits");
  EXPECT_EQ(text("Pending/structured-172-2026-11-23-1.jsonl"), "172/2026-11-23.jsonl");
  EXPECT_EQ(names("Structured/172"), (Names{"2026-11-24.jsonl", "notes.txt"}));
}

TEST_F(SpoolTest, SubmitsAllThatIsPendingOnceAndKeepsFiveCarewellLogs) {
  spool.submitPending(kDate);
  EXPECT_TRUE(write("a"));
  put("Outbox/2026-11-24-090704-0", "");
  spool.submitPending(kDate);
  put("Pending/.tmp-abcdef", "half");
  spool.submitPending(kDate);  // nothing that counts
  EXPECT_EQ(names("Outbox"), (Names{"2026-11-24-090704-0", "2026-11-24-090704-1"}));
  EXPECT_EQ(names("Outbox/2026-11-24-090704-1"),
            (Names{"a-2026-11-24-090704-0.165", "a-2026-11-24-090704-0.165.meta.plist"}));
  EXPECT_EQ(names("Pending"), Names{});

  for (const char* generation : {"1", "2", "3", "4", "5", "6", "7"}) {
    put("Carewell/x.log", generation);
    spool.rollCarewell();
  }
  EXPECT_EQ(names("Carewell"), (Names{"x.log.1", "x.log.2", "x.log.3", "x.log.4", "x.log.5"}));
  EXPECT_EQ(text("Carewell/x.log.5"), "3");
  fs::remove(device.host.devicePath(std::string(kLogs) + "Carewell/x.log.5"));
  put("Carewell/x.log.5/in the way", "");
  put("Carewell/x.log", "8");
  spool.rollCarewell();
  EXPECT_EQ(text("Carewell/x.log.4") + text("Carewell/x.log"), "48");  // nothing replaced another
}

TEST(LinuxNotificationsTest, CountEveryPostOfSeveralThreads) {
  TestHost device;
  LinuxNotifications notifications(device.host);
  const auto post = [&] {
    for (int i = 0; i < 50; ++i) notifications.post("n");
  };
  std::thread other(post);
  post();
  other.join();
  EXPECT_EQ(device.text("/var/run/notifications/n"), "100\n");
  device.put("/var/run/notifications/n", "rubbish");
  for (const char* name : {"n", "../out", "", ".n"}) notifications.post(name);
  EXPECT_EQ(device.text("/var/run/notifications/n"), "1\n");
  EXPECT_EQ(device.names("/var/run"), (Names{"notifications", "notifications.lock"}));
  EXPECT_EQ(device.names("/var/run/notifications"), Names{"n"});
}

TEST(LinuxSystemLogTest, WritesLinesThatStayLines) {
  TestPlatform device;
  device.setClock(kNow);
  const auto write = [&] {
    LinuxPlatform platform(device.host);
    SystemLog& log = platform.services().systemLog;
    log.message(LogLevel::Default, "day %d of %s", 20780, "text");
    log.message(LogLevel::Info, "%{public}@ and %@", PlistValue::string("a\nb"), PlistValue::int64(1));
    log.message(LogLevel::Debug, "debug");
    log.message(LogLevel::Error, "100%%");
    log.writePlain("plain %d\n");
  };
  const std::string start = "2026-11-24T09:07:04.999511Z " + std::string(program_invocation_short_name) +
                            "[" + std::to_string(::getpid()) + "] ";
  const std::string end = start + "error: 100%\n" + start + "default: plain %d\n\t\n";
  write();
  const std::string lines =
      start + "default: day 20780 of <private>\n" + start + "info: a\n\tb and <private>\n" + end;
  EXPECT_EQ(device.text("/var/log/tbdaily.log"), lines);

  ::setenv("TBDAILY_LOG", "stderr", 1);
  ::setenv("JOURNAL_STREAM", "8:1", 1);
  ::testing::internal::CaptureStderr();
  write();
  EXPECT_EQ(::testing::internal::GetCapturedStderr(), "<5>" + start + "default: day 20780 of <private>\n<6>" +
                                                          start + "info: a\n<6>\tb and <private>\n<3>" +
                                                          start + "error: 100%\n<5>" + start +
                                                          "default: plain %d\n<5>\t\n");
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
