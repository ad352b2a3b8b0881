// A system log that is looked at, for commands that watch the job's own code at work without letting it act.
#pragma once

#include <string>
#include <vector>

#include "platform/system_log.h"

namespace tbdaily {

// Keeps messages in memory instead of writing them.
class CapturedLog : public SystemLog {
 public:
  struct Message {
    LogLevel level;
    std::string text;
  };
  bool isEnabled(LogLevel level) override { return level != LogLevel::Debug; }
  void write(LogLevel level, std::string_view format, std::span<const LogArgument> arguments) override {
    messages.push_back({level, formatLogMessage(format, arguments, true)});
  }
  void writePlain(std::string_view message) override {
    messages.push_back({LogLevel::Default, std::string(message)});
  }

  // The texts of the error level.
  std::vector<std::string> errors() const;

  std::vector<Message> messages;
};

}  // namespace tbdaily
