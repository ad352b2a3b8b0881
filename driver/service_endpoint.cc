#include "driver/service_endpoint.h"

#include "driver/app_info.h"
#include "driver/daily_tasks.h"
#include "platform/notifications.h"
#include "platform/system_log.h"

namespace tbdaily {

CommandState gCommandState;

void HandleNewConnection(Platform& platform, const ServiceEvent& event) {
  if (event.kind != ServiceEventKind::NewPeer) return;
  ServiceListener& listener = platform.serviceListener;
  listener.setDeliveryQueue(event.peer, DeliveryQueue::Main);
  listener.setEventHandler(event.peer,
                           [&platform](const ServiceEvent& e) { HandlePeerMessage(platform, e); });
  listener.resume(event.peer);
}

void HandlePeerMessage(Platform& platform, const ServiceEvent& event) {
  if (event.kind != ServiceEventKind::Message) return;
  const auto operation = static_cast<Operation>(messageInteger(event.message, "operation") & 0xFFFFFFFF);
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

void HandleCommandOnce(Platform& platform, const PlistDictionary& message, Operation operation) {
  if (operation == Operation::RunForDay) {
    RunDailyTasks(platform, static_cast<DayNumber>(messageInteger(message, "value") & 0xFFFFFFFF),
                  PlistValue());
  } else if (operation == Operation::LoggingStatus) {
    gCommandState.gAppInfoRequested = true;
    platform.notifications.post(kLoggingNotification);
    platform.systemLog.message(LogLevel::Default,
                               "notified of logging status, waiting for activate app info");
  }
}

}  // namespace tbdaily
