#include "platform/linux/log_spool.h"

#include <gtest/gtest.h>

#include "platform/linux/host_test_support.h"
#include "platform/plist_text.h"

namespace tbdaily {
namespace {

namespace fs = std::filesystem;
using testing::TestHost;
using Names = std::vector<std::string>;
constexpr double kNow = 1795511224.99951171875;
const PlistDate kDate = PlistDate::fromUnixSeconds(kNow);
constexpr const char* kLogs = "/var/mobile/Library/Logs/";

struct SpoolTest : ::testing::Test {
  bool write(const char* name, bool whole = true, double at = kNow) {
    return spool.writeLog(
        Consent::Yes, "165", name, {}, PlistDate::fromUnixSeconds(at),
        [&](LogOutput& output) { return output.write(std::as_bytes(std::span("text", 4))) && whole; });
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
  PlistDictionary meta =
      device.parse(text("Pending/log-2026-11-24-090704-0.165.meta.plist")).mutableDictionary();
  EXPECT_EQ(meta.get("id").asString().value_or("").size(), 36U);
  meta.set("id", {});
  EXPECT_EQ(plistText(PlistValue::dictionary(meta)),
            R"({"type": "165", "name": "log", "created": 2026-11-24 09:07:04 +0000})");
}

TEST_F(SpoolTest, TakesNothingWhereItCannotWrite) {
  put("Pending", "a file in the folder's place");
  put("Structured", "");
  put("Carewell", "");
  EXPECT_FALSE(write("log"));
  spool.appendStructured(172, {}, kDate);
  spool.dumpOldStructured(Consent::Yes, kDate);
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
  spool.dumpOldStructured(Consent::Yes, kDate);
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
  fs::remove(device.host.files().place(std::string(kLogs) + "Carewell/x.log.5"));
  put("Carewell/x.log.5/in the way", "");
  put("Carewell/x.log", "8");
  spool.rollCarewell();
  EXPECT_EQ(text("Carewell/x.log.4") + text("Carewell/x.log"), "48");  // nothing replaced another
}

}  // namespace
}  // namespace tbdaily
