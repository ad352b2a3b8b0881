// A named IPC endpoint and the event loop that serves it.
//
// Absent service: no endpoint can be created; a slice times out.
#pragma once

#include <cstdint>
#include <functional>
#include <string_view>

#include "platform/plist_value.h"

namespace tbdaily {

// A listener or a peer connection; 0 is none.
using ServiceConnection = std::uint32_t;

enum class ServiceEventKind : std::uint8_t { NewPeer, Message, Error };

struct ServiceEvent {
  ServiceEventKind kind = ServiceEventKind::Error;
  ServiceConnection peer = 0;  // NewPeer: the new connection
  PlistValue message;          // Message: a dictionary, what was received
};

using ServiceEventHandler = std::function<void(const ServiceEvent&)>;

// Where events are delivered. There is one: the main queue, served only while a slice of the main event loop
// runs.
enum class DeliveryQueue : std::uint8_t { Main };

enum class SliceResult : std::uint8_t { Finished, Stopped, TimedOut, HandledEvent };

class ServiceListener {
 public:
  virtual ~ServiceListener() = default;

  // 0 when the endpoint cannot be created.
  virtual ServiceConnection createListener(std::string_view endpointName, DeliveryQueue queue) = 0;
  virtual void setDeliveryQueue(ServiceConnection connection, DeliveryQueue queue) = 0;
  virtual void setEventHandler(ServiceConnection connection, ServiceEventHandler handler) = 0;
  // No event of a connection is delivered before it is resumed.
  virtual void resume(ServiceConnection connection) = 0;

  // Runs the main event loop in its default mode until one event was handled, at most for `seconds`.
  virtual SliceResult runSlice(double seconds) = 0;
};

}  // namespace tbdaily
