#include "platform/linux/linux_system_log.h"

#include <unistd.h>

#include <array>
#include <cstdlib>

#include "platform/calendar.h"
#include "platform/linux/base/host_notes.h"
#include "platform/utf8.h"

namespace tbdaily {

namespace {

constexpr std::string_view kFolder = "/var/log";
constexpr const char* kFile = "tbdaily.log";

struct LevelText {
  std::string_view name;
  std::string_view journalPrefix;
};

// In the order of LogLevel.
constexpr std::array<LevelText, 4> kLevels = {{
    {"default", "<5>"},
    {"info", "<6>"},
    {"debug", "<7>"},
    {"error", "<3>"},
}};

bool environmentIs(const char* variable, std::string_view value) {
  const char* text = std::getenv(variable);
  return text != nullptr && text == value;
}

// A line that cannot be made is no reason to end what it tells of.
template <typename Line>
void writeOrNote(Line&& line) {
  try {
    line();
  } catch (const std::exception& failure) {
    noteOnce(std::string("a line of the log is lost: ") + failure.what());
  }
}

}  // namespace

LinuxSystemLog::LinuxSystemLog(const Host& host, Kernel& kernel, DeviceAnswers& answers)
    : host_(host),
      kernel_(kernel),
      answers_(answers),
      sender_(withoutControls(kernel.processName(), TextPlace::Line) + "[" +
              std::to_string(kernel.processIdentifier()) + "]"),
      toStandardError_(environmentIs("TBDAILY_LOG", "stderr")),
      journal_(toStandardError_ && std::getenv("JOURNAL_STREAM") != nullptr),
      debug_(environmentIs("TBDAILY_LOG_DEBUG", "1")) {}

bool LinuxSystemLog::isEnabled(LogLevel level) {
  return level != LogLevel::Debug || debug_;
}

bool LinuxSystemLog::showsPrivate() {
  const std::lock_guard guard(mutex_);
  if (!showsPrivate_) {
    showsPrivate_ = environmentIs("TBDAILY_LOG_PRIVATE", "show") || answers_.booleanAnswer("InternalBuild");
  }
  return *showsPrivate_;
}

void LinuxSystemLog::write(LogLevel level, std::string_view format, std::span<const LogArgument> arguments) {
  if (!isEnabled(level)) return;
  writeOrNote([&] { writeLine(level, formatLogMessage(format, arguments, showsPrivate())); });
}

void LinuxSystemLog::writePlain(std::string_view message) {
  writeOrNote([&] { writeLine(LogLevel::Default, message); });
}

void LinuxSystemLog::writeLine(LogLevel level, std::string_view message) {
  const LevelText& text = kLevels[static_cast<std::size_t>(level)];
  const std::string_view prefix = journal_ ? text.journalPrefix : "";
  std::string lines(prefix);
  lines.append(stampText(kernel_.currentTime(), 6)).append(" ").append(sender_).append(" ");
  lines.append(text.name).append(": ");
  for (const char c : withoutControls(message, TextPlace::LogMessage)) {
    lines += c;
    if (c == '\n') lines.append(prefix).append("\t");
  }
  append(lines += '\n');
}

void LinuxSystemLog::append(const std::string& lines) {
  const std::lock_guard guard(mutex_);
  if (toStandardError_) {
    writeAll(STDERR_FILENO, lines);
    return;
  }
  if (!file_.isOpen()) {
    DeviceFolder folder;
    int error = host_.files().makeFolder(kFolder, folder);
    if (error == 0) error = folder.openForAppending(kFile, file_);
    if (error != 0) return noteWriteFailure(host_.files().place(kFolder) / kFile, error);
  }
  if (const int error = writeAll(file_.get(), lines); error != 0)
    noteWriteFailure(host_.files().place(kFolder) / kFile, error);
}

}  // namespace tbdaily
