#include "tools/tallyctl/platform_overrides.h"

namespace tbdaily {

std::vector<std::string> CapturedLog::errors() const {
  std::vector<std::string> texts;
  for (const Message& message : messages) {
    if (message.level == LogLevel::Error) texts.push_back(message.text);
  }
  return texts;
}

Platform withSystemLog(const Platform& p, SystemLog& log) {
  return {p.driverRegistry,
          p.preferences,
          p.deviceAnswers,
          p.logSubmission,
          p.analyticsClient,
          p.analyticsHistory,
          p.propertyListCodec,
          p.stackSnapshot,
          p.usageService,
          p.appRegistry,
          p.localeSettings,
          p.serviceListener,
          p.notifications,
          log,
          p.kernel,
          p.fileSystem,
          p.dynamicLoader,
          p.messageDigest};
}

}  // namespace tbdaily
