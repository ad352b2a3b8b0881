#include "driver/service_endpoint.h"

#include "driver/app_info.h"
#include "driver/daily_tasks.h"
#include "driver/step.h"
#include "platform/notifications.h"
#include "platform/system_log.h"

namespace tbdaily {

CommandState gCommandState;

namespace {
// A field that is absent or of another kind reads as 0.
std::int64_t integerField(const PlistValue& message, std::string_view field) {
  return message.get(field).asInteger().value_or(0);
}
}  // namespace

void HandleNewConnection(Platform& platform, const ServiceEvent& event) {
  if (event.kind != ServiceEventKind::NewPeer) return;
  ServiceListener& listener = platform.serviceListener;
  listener.setDeliveryQueue(event.peer, DeliveryQueue::Main);
  listener.setEventHandler(event.peer, [&platform](const ServiceEvent& e) {
    runStep(platform, "a message", [&] { HandlePeerMessage(platform, e); });
  });
  listener.resume(event.peer);
}

void HandlePeerMessage(Platform& platform, const ServiceEvent& event) {
  if (event.kind != ServiceEventKind::Message) return;
  const auto operation = static_cast<Operation>(integerField(event.message, "operation") & 0xFFFFFFFF);
  if (operation != Operation::ActivatedAppInfo) {
    gCommandState.commandOnce.run([&] { HandleCommandOnce(platform, event.message, operation); });
    return;
  }
  const PlistValue appInfo = appInfoFromMessage(event.message);
  const bool requested = gCommandState.gAppInfoRequested;
  platform.systemLog.message(LogLevel::Default, "tbdaily got %sAAI:\n%@",
                             requested ? "requested" : "(unsolicited -- so ignoring) ", appInfo);
  if (!requested) return;
  RunDailyTasksIfNewDay(platform, appInfo);
  gCommandState.gAppInfoRequested = false;
}

void HandleCommandOnce(Platform& platform, const PlistValue& message, Operation operation) {
  if (operation == Operation::RunForDay) {
    RunDailyTasks(platform, static_cast<DayNumber>(integerField(message, "value") & 0xFFFFFFFF),
                  PlistValue());
  } else if (operation == Operation::LoggingStatus) {
    gCommandState.gAppInfoRequested = true;
    platform.notifications.post(kLoggingNotification);
    platform.systemLog.message(LogLevel::Default,
                               "notified of logging status, waiting for activate app info");
  }
}

}  // namespace tbdaily
