// The job's service endpoint: accepts peers and acts on their messages.
#pragma once

#include <cstdint>
#include <string_view>

#include "platform/platform.h"
#include "platform/run_once.h"
#include "platform/service_listener.h"

namespace tbdaily {

inline constexpr std::string_view kEndpointName = "com.velmora.tallyd.tbdaily";
inline constexpr std::string_view kLoggingNotification = "com.velmora.tallyd.tbdaily.logging";

// The low 32 bits of a message's "operation".
enum class Operation : std::int32_t { LoggingStatus = 0, RunForDay = 1, ActivatedAppInfo = 2 };

// What the messages of one process leave behind; main thread only. Tests put a fresh one in its place.
struct CommandState {
  // Set by a logging-status command, cleared when app info was consumed.
  bool gAppInfoRequested = false;
  // Admits the first message that is no app info; every later one is dropped.
  RunOnce commandOnce;
};
extern CommandState gCommandState;

// A new peer is served on the main queue; every other event on the listener is ignored.
void HandleNewConnection(Platform& platform, const ServiceEvent& event);

// App info is taken when it was asked for; any other operation goes to HandleCommandOnce. Events that are no
// message are ignored.
void HandlePeerMessage(Platform& platform, const ServiceEvent& event);

// Runs the day's work for a given day, or asks the system for the activated-app info. At most once in a
// process.
void HandleCommandOnce(Platform& platform, const PlistValue& message, Operation operation);

}  // namespace tbdaily
