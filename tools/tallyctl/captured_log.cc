#include "tools/tallyctl/captured_log.h"

namespace tbdaily {

std::vector<std::string> CapturedLog::errors() const {
  std::vector<std::string> texts;
  for (const Message& message : messages) {
    if (message.level == LogLevel::Error) texts.push_back(message.text);
  }
  return texts;
}

}  // namespace tbdaily
