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
int removeStaleSocket(const std::filesystem::path& path) {
  struct stat status {};
  if (::lstat(path.c_str(), &status) != 0) return errno == ENOENT ? 0 : errno;
  if (!S_ISSOCK(status.st_mode)) return EEXIST;
  const SocketResult probe = connectUnixSocket(path);
  if (probe.error == 0) return EADDRINUSE;
  if (probe.error != ECONNREFUSED) return probe.error;
  return ::unlink(path.c_str()) == 0 ? 0 : errno;
}

}  // namespace

std::filesystem::path endpointPath(const Host& host, std::string_view endpointName) {
  return host.devicePath("/var/run") / (std::string(endpointName) + ".sock");
}

LinuxServiceListener::~LinuxServiceListener() {
  if (!boundPath_.empty()) ::unlink(boundPath_.c_str());
}

ServiceConnection LinuxServiceListener::add(FileDescriptor socket, bool isListener) {
  Connection connection;
  connection.socket = std::move(socket);
  connection.isListener = isListener;
  connections_.emplace(++lastIdentifier_, std::move(connection));
  return lastIdentifier_;
}

ServiceConnection LinuxServiceListener::createListener(std::string_view endpointName, DeliveryQueue) {
  if (!isSafeName(endpointName)) return 0;
  if (FileDescriptor passed = takePassedListener(); passed.isOpen()) return add(std::move(passed), true);

  const std::filesystem::path path = endpointPath(host_, endpointName);
  const auto refuse = [&path](int error) -> ServiceConnection {
    noteOnce("cannot serve " + path.native() + ": " +
             (error == EADDRINUSE ? "another job is listening there" : errorText(error)));
    return 0;
  };
  if (const int error = host_.makeFolders(path.parent_path()); error != 0) {
    noteWriteFailure(path.parent_path(), error);
    return 0;
  }
  // Two jobs that start at once must not both find the same stale socket.
  const int lockError = endpointLock_.acquire(path.native() + ".lock", 0);
  if (lockError != 0) return refuse(lockError == EWOULDBLOCK ? EADDRINUSE : lockError);
  if (const int error = removeStaleSocket(path); error != 0) return refuse(error);
  SocketResult listening = listenUnixSocket(path);
  if (listening.error != 0) return refuse(listening.error);
  boundPath_ = path;
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

bool LinuxServiceListener::acceptPeer(ServiceConnection listener) {
  FileDescriptor socket(
      ::accept4(connections_.at(listener).socket.get(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
  if (!socket.isOpen()) {
    // The peer stays in the queue and the listener ready: without a rest the loop would spin.
    if (errno == EMFILE || errno == ENFILE || errno == ENOBUFS || errno == ENOMEM)
      std::this_thread::sleep_for(kRestWithoutDescriptors);
    return false;
  }
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
    received.resize(have + std::min(whole - have, kReadSize));
    const ssize_t count = ::read(connection.socket.get(), received.data() + have, received.size() - have);
    const int error = errno;
    received.resize(have + static_cast<std::size_t>(std::max<ssize_t>(count, 0)));
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
  const bool full = connections_.size() > kMaximumPeers;
  for (const auto& [id, connection] : connections_) {
    if (!connection.resumed || (connection.isListener && full)) continue;
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
