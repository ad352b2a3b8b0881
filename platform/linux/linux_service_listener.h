// The service endpoint as a Unix stream socket, var/run/<endpoint name>.sock, and the event loop that serves
// it.
//
// A message is a u32 little-endian length and that many bytes of a property list whose root is a dictionary.
// Whole messages, new peers and errors are events; bytes that trickle in, refused peers and peers that leave
// between two messages are none.
#pragma once

#include <chrono>
#include <map>
#include <vector>

#include "platform/linux/base/host.h"
#include "platform/linux/base/passing_file.h"
#include "platform/property_list_codec.h"
#include "platform/service_listener.h"

namespace tbdaily {

class LinuxServiceListener : public ServiceListener {
 public:
  static constexpr std::size_t kMaximumMessageLength = std::size_t{16} << 20;
  // Where there is no room for a new peer, or for more of a message, the connection that has been idle
  // longest gives way.
  static constexpr std::size_t kMaximumPeers = 256;
  static constexpr std::size_t kMaximumUnfinished = std::size_t{64}
                                                    << 20;  // bytes of all messages on their way

  LinuxServiceListener(const Host& host, PropertyListCodec& codec) : host_(host), codec_(codec) {}
  ~LinuxServiceListener() override;

  ServiceConnection createListener(std::string_view endpointName, DeliveryQueue queue) override;
  void setDeliveryQueue(ServiceConnection connection, DeliveryQueue queue) override;
  void setEventHandler(ServiceConnection connection, ServiceEventHandler handler) override;
  void resume(ServiceConnection connection) override;
  SliceResult runSlice(double seconds) override;

 private:
  struct Connection {
    FileDescriptor socket;
    bool isListener = false;
    bool resumed = false;
    ServiceEventHandler handler;
    std::vector<std::byte> received;  // of the message that is on its way: length and bytes
    std::uint64_t lastActive = 0;     // counts what arrived anywhere
  };

  ServiceConnection add(FileDescriptor socket, bool isListener);
  std::vector<ServiceConnection> waitForReady(std::chrono::steady_clock::time_point deadline);
  // Each answers whether an event was delivered.
  bool serve(ServiceConnection id);
  bool acceptPeer(ServiceConnection listener);
  bool receive(ServiceConnection peer);
  bool finishMessage(ServiceConnection peer);
  bool fail(ServiceConnection peer, const std::string& reason);
  // The peer that has been idle longest, of those that hold part of a message or of all; 0 when there is none
  // but `except`.
  enum class Holding : bool { Anything, PartOfAMessage };
  ServiceConnection idleLongest(Holding holding, ServiceConnection except = 0) const;
  FileDescriptor acceptSocket(ServiceConnection listener);
  std::size_t unfinishedBytes() const;
  void deliver(ServiceConnection id, const ServiceEvent& event);

  const Host& host_;
  PropertyListCodec& codec_;
  std::map<ServiceConnection, Connection> connections_;
  ServiceConnection lastIdentifier_ = 0;
  ServiceConnection lastServed_ = 0;  // peers take turns
  std::uint64_t activity_ = 0;
  DeviceFolder folder_;    // of the socket; not open when that was passed in
  std::string boundName_;  // of the socket in it; empty while there is none
  FileLock endpointLock_;
};

// Where the endpoint's socket lies: its folder, and its name in it.
inline constexpr std::string_view kEndpointFolder = "/var/run";
std::string endpointSocketName(std::string_view endpointName);

}  // namespace tbdaily
