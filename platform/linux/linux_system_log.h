// The system log as lines of text: appended to var/log/tbdaily.log, or written to standard error with
// TBDAILY_LOG=stderr.
#pragma once

#include <mutex>
#include <optional>
#include <string>

#include "platform/device_answers.h"
#include "platform/kernel.h"
#include "platform/linux/base/file_io.h"
#include "platform/linux/base/host.h"
#include "platform/system_log.h"

namespace tbdaily {

class LinuxSystemLog : public SystemLog {
 public:
  // Reads TBDAILY_LOG, TBDAILY_LOG_DEBUG, TBDAILY_LOG_PRIVATE and JOURNAL_STREAM.
  LinuxSystemLog(const Host& host, Kernel& kernel, DeviceAnswers& answers);

  bool isEnabled(LogLevel level) override;
  void write(LogLevel level, std::string_view format, std::span<const LogArgument> arguments) override;
  void writePlain(std::string_view message) override;

 private:
  bool showsPrivate();
  void writeLine(LogLevel level, std::string_view message);
  void append(const std::string& lines);

  const Host& host_;
  Kernel& kernel_;
  DeviceAnswers& answers_;
  std::string sender_;  // "tbdaily[412]"
  bool toStandardError_;
  bool journal_;
  bool debug_;
  std::mutex mutex_;  // over what follows
  std::optional<bool> showsPrivate_;
  FileDescriptor file_;
};

}  // namespace tbdaily
