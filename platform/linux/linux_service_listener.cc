#include "platform/linux/linux_service_listener.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <limits>
#include <thread>

#include "platform/byte_reader.h"
#include "platform/linux/base/host_notes.h"
#include "platform/linux/unix_socket.h"

namespace tbdaily {

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::size_t kLengthSize = 4;
constexpr std::size_t kReadSize = std::size_t{64} << 10;
constexpr auto kRestWithoutDescriptors = std::chrono::milliseconds(20);

int pollTimeout(Clock::time_point deadline) {
  const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now()).count();
  return static_cast<int>(std::clamp<std::int64_t>(left, 0, std::numeric_limits<int>::max()));
}

// Clears the way for a new socket: removes one that nobody serves. An errno value when the place is taken.
int removeStaleSocket(const DeviceFolder& folder, const std::string& name) {
  struct stat status {};
  if (const int error = folder.status(name, status); error != 0) return error == ENOENT ? 0 : error;
  if (!S_ISSOCK(status.st_mode)) return EEXIST;
  const SocketResult probe = connectUnixSocket(folder, name);
  if (probe.error == 0) return EADDRINUSE;
  if (probe.error != ECONNREFUSED) return probe.error;
  return folder.remove(name);
}

}  // namespace

std::string endpointSocketName(std::string_view endpointName) {
  return std::string(endpointName) + ".sock";
}

LinuxServiceListener::~LinuxServiceListener() {
  if (!boundName_.empty()) folder_.remove(boundName_);
}

ServiceConnection LinuxServiceListener::add(FileDescriptor socket, bool isListener) {
  Connection connection;
  connection.socket = std::move(socket);
  connection.isListener = isListener;
  connection.lastActive = ++activity_;
  connections_.emplace(++lastIdentifier_, std::move(connection));
  return lastIdentifier_;
}

ServiceConnection LinuxServiceListener::createListener(std::string_view endpointName, DeliveryQueue) {
  if (!isSafeName(endpointName)) return 0;
  if (FileDescriptor passed = takePassedListener(); passed.isOpen()) return add(std::move(passed), true);

  const std::string name = endpointSocketName(endpointName);
  const auto refuse = [&](int error) -> ServiceConnection {
    noteOnce("cannot serve " + (host_.files().place(kEndpointFolder) / name).native() + ": " +
             (error == EADDRINUSE ? "another job is listening there" : errorText(error)));
    return 0;
  };
  if (const int error = host_.files().makeFolder(kEndpointFolder, folder_); error != 0) {
    noteWriteFailure(host_.files().place(kEndpointFolder), error);
    return 0;
  }
  // Two jobs that start at once must not both find the same stale socket.
  const int lockError = endpointLock_.acquire(folder_, name + ".lock", 0);
  if (lockError != 0) return refuse(lockError == EWOULDBLOCK ? EADDRINUSE : lockError);
  if (const int error = removeStaleSocket(folder_, name); error != 0) return refuse(error);
  SocketResult listening = listenUnixSocket(folder_, name);
  if (listening.error != 0) return refuse(listening.error);
  boundName_ = name;
  return add(std::move(listening.socket), true);
}

void LinuxServiceListener::setDeliveryQueue(ServiceConnection, DeliveryQueue) {
}  // there is only the main queue

void LinuxServiceListener::setEventHandler(ServiceConnection connection, ServiceEventHandler handler) {
  const auto found = connections_.find(connection);
  if (found != connections_.end()) found->second.handler = std::move(handler);
}

void LinuxServiceListener::resume(ServiceConnection connection) {
  const auto found = connections_.find(connection);
  if (found != connections_.end()) found->second.resumed = true;
}

void LinuxServiceListener::deliver(ServiceConnection id, const ServiceEvent& event) {
  lastServed_ = id;
  const auto found = connections_.find(id);
  if (found == connections_.end()) return;
  const ServiceEventHandler handler = found->second.handler;  // a copy: the handler may replace itself
  if (handler) handler(event);
}

bool LinuxServiceListener::fail(ServiceConnection peer, const std::string& reason) {
  noteOnce("a message to the endpoint was refused: " + reason);
  deliver(peer, ServiceEvent{});
  connections_.erase(peer);
  return true;
}

ServiceConnection LinuxServiceListener::idleLongest(Holding holding, ServiceConnection except) const {
  ServiceConnection found = 0;
  for (const auto& [id, connection] : connections_) {
    if (connection.isListener || id == except) continue;
    if (holding == Holding::PartOfAMessage && connection.received.empty()) continue;
    if (found == 0 || connection.lastActive < connections_.at(found).lastActive) found = id;
  }
  return found;
}

std::size_t LinuxServiceListener::unfinishedBytes() const {
  std::size_t bytes = 0;
  for (const auto& [id, connection] : connections_) bytes += connection.received.capacity();
  return bytes;
}

FileDescriptor LinuxServiceListener::acceptSocket(ServiceConnection listener) {
  const int listening = connections_.at(listener).socket.get();
  while (true) {
    const bool isFull = connections_.size() > kMaximumPeers;  // the listener is one of them
    FileDescriptor socket;
    if (!isFull)
      socket = FileDescriptor(::accept4(listening, nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
    const bool lacksRoom =
        isFull ||
        (!socket.isOpen() && (errno == EMFILE || errno == ENFILE || errno == ENOBUFS || errno == ENOMEM));
    if (!lacksRoom) return socket;
    const ServiceConnection idle = idleLongest(Holding::Anything);
    if (idle == 0) {
      // The peer stays in the queue and the listener ready: without a rest the loop would spin.
      std::this_thread::sleep_for(kRestWithoutDescriptors);
      return socket;
    }
    noteOnce("there are too many peers at the endpoint: those that are idle longest give way");
    connections_.erase(idle);
  }
}

bool LinuxServiceListener::acceptPeer(ServiceConnection listener) {
  FileDescriptor socket = acceptSocket(listener);
  if (!socket.isOpen()) return false;
  if (!isTrustedPeer(socket.get())) {
    noteOnce("a peer of another user was refused at the endpoint");
    return false;
  }
  const ServiceConnection peer = add(std::move(socket), false);
  deliver(listener, ServiceEvent{ServiceEventKind::NewPeer, peer, {}});
  return true;
}

bool LinuxServiceListener::finishMessage(ServiceConnection peer) {
  std::vector<std::byte>& received = connections_.at(peer).received;
  PlistParseResult parsed = codec_.parse(std::span(received).subspan(kLengthSize));
  received = {};
  if (parsed.value.asDictionary() == nullptr)
    return fail(peer, parsed.error.empty() ? "its root is no dictionary" : parsed.error);
  deliver(peer, ServiceEvent{ServiceEventKind::Message, 0, std::move(parsed.value)});
  return true;
}

bool LinuxServiceListener::receive(ServiceConnection peer) {
  Connection& connection = connections_.at(peer);
  std::vector<std::byte>& received = connection.received;
  while (true) {
    const std::size_t have = received.size();
    const std::size_t whole =
        have < kLengthSize ? kLengthSize : kLengthSize + *ByteReader(received).at<std::uint32_t>(0);
    if (whole - kLengthSize > kMaximumMessageLength) return fail(peer, "it is longer than 16 MiB");
    if (have >= kLengthSize && have == whole) return finishMessage(peer);

    // Room grows with what arrives, not with what the length promises.
    const std::size_t wanted = have + std::min(whole - have, kReadSize);
    if (wanted > received.capacity()) {
      const std::size_t room =
          std::min(std::max(wanted, 2 * received.capacity()), std::max(whole, kLengthSize));
      if (unfinishedBytes() - received.capacity() + room > kMaximumUnfinished) {
        const ServiceConnection idle = idleLongest(Holding::PartOfAMessage, peer);
        return fail(idle != 0 ? idle : peer, "too much of unfinished messages is waiting");
      }
      received.reserve(room);
    }
    received.resize(wanted);
    const ssize_t count = ::read(connection.socket.get(), received.data() + have, received.size() - have);
    const int error = errno;
    received.resize(have + static_cast<std::size_t>(std::max<ssize_t>(count, 0)));
    if (count > 0) connection.lastActive = ++activity_;
    if (count > 0) continue;
    if (count < 0 && error == EINTR) continue;
    if (count < 0 && error == EAGAIN) return false;
    if (have > 0) return fail(peer, "the peer left in the middle of it");
    connections_.erase(peer);
    return false;
  }
}

bool LinuxServiceListener::serve(ServiceConnection id) {
  return connections_.at(id).isListener ? acceptPeer(id) : receive(id);
}

std::vector<ServiceConnection> LinuxServiceListener::waitForReady(Clock::time_point deadline) {
  std::vector<pollfd> polled;
  std::vector<ServiceConnection> ids;
  for (const auto& [id, connection] : connections_) {
    if (!connection.resumed) continue;
    polled.push_back({connection.socket.get(), POLLIN, 0});
    ids.push_back(id);
  }
  std::vector<ServiceConnection> ready;
  if (::poll(polled.data(), polled.size(), pollTimeout(deadline)) <= 0) return ready;
  for (std::size_t i = 0; i < polled.size(); ++i) {
    if (polled[i].revents != 0) ready.push_back(ids[i]);
  }
  // The first after the one that was served last comes first.
  std::rotate(ready.begin(), std::upper_bound(ready.begin(), ready.end(), lastServed_), ready.end());
  return ready;
}

SliceResult LinuxServiceListener::runSlice(double seconds) {
  const auto deadline =
      Clock::now() + std::chrono::duration_cast<Clock::duration>(std::chrono::duration<double>(seconds));
  do {
    for (const ServiceConnection id : waitForReady(deadline)) {
      if (serve(id)) return SliceResult::HandledEvent;
    }
  } while (Clock::now() < deadline);
  return SliceResult::TimedOut;
}

}  // namespace tbdaily
