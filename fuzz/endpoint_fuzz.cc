// Frames of several peers at the endpoint, in slices of any size: each peer's messages arrive as its own
// bytes say, whatever the slices and whatever the others send.
#include <sys/socket.h>
#include <unistd.h>

#include <csignal>
#include <map>
#include <vector>

#include "fuzz/input.h"
#include "platform/byte_reader.h"
#include "platform/byte_writer.h"
#include "platform/linux/linux_service_listener.h"
#include "platform/linux/unix_socket.h"
#include "platform/plist/codec.h"
#include "testing/temporary_folder.h"

using namespace tbdaily;
using fuzz::Input;
using fuzz::require;

namespace {

constexpr const char* kName = "com.example.e";
constexpr std::size_t kPeers = 3;
constexpr std::size_t kLength = 4;

struct Received {
  std::vector<PlistValue> messages;
  bool failed = false;
  friend bool operator==(const Received&, const Received&) = default;
};

PlistCodec codec;

// What a peer's bytes hold when it leaves after them.
Received receivedFrom(std::span<const std::byte> bytes) {
  Received all;
  while (!bytes.empty() && !all.failed) {
    const auto length = ByteReader(bytes).at<std::uint32_t>(0);
    const std::size_t whole = kLength + length.value_or(0);
    const bool isWhole =
        length && *length <= LinuxServiceListener::kMaximumMessageLength && bytes.size() >= whole;
    PlistValue message;
    if (isWhole) message = codec.parse(bytes.subspan(kLength, *length)).value;
    all.failed = message.asDictionary() == nullptr;
    if (all.failed) break;
    all.messages.push_back(std::move(message));
    bytes = bytes.subspan(whole);
  }
  return all;
}

class Endpoint {
 public:
  Endpoint() {
    std::signal(SIGPIPE, SIG_IGN);
    const ServiceConnection endpoint = listener_.createListener(kName, DeliveryQueue::Main);
    require(endpoint != 0, "the endpoint can be made");
    listener_.setEventHandler(endpoint, [this](const ServiceEvent& event) {
      listener_.setEventHandler(event.peer, [this, peer = event.peer](const ServiceEvent& message) {
        if (message.kind == ServiceEventKind::Message) received_[peer].messages.push_back(message.message);
        if (message.kind == ServiceEventKind::Error) received_[peer].failed = true;
      });
      received_[event.peer];
      listener_.resume(event.peer);
    });
    listener_.resume(endpoint);
    require(host_.files().makeFolder(kEndpointFolder, folder_) == 0, "the endpoint's folder can be opened");
  }

  void serve() {
    while (listener_.runSlice(0) == SliceResult::HandledEvent) {
    }
  }
  FileDescriptor connect() {
    SocketResult result = connectUnixSocket(folder_, endpointSocketName(kName));
    require(result.socket.isOpen(), "a peer can connect");
    serve();
    return std::move(result.socket);
  }
  // What came since the last call, a peer each in the order of connecting.
  std::map<ServiceConnection, Received> take() { return std::exchange(received_, {}); }

 private:
  testing::TemporaryFolder root_;
  Host host_{root_.path(), false};
  LinuxServiceListener listener_{host_, codec};
  DeviceFolder folder_;
  std::map<ServiceConnection, Received> received_;
};

// The bytes of a peer: frames whose lengths mostly are right.
std::vector<std::byte> streamOf(Input& input) {
  std::vector<std::byte> bytes;
  for (std::size_t count = input.below(5); count > 0; --count) {
    const std::size_t kind = input.below(8);
    const auto body = input.section();
    static constexpr std::string_view kMessage =
        "<plist><dict><key>n</key><integer>1</integer></dict></plist>";
    const auto sent = kind < 3 ? std::as_bytes(std::span(kMessage)) : body;
    appendLittleEndian(bytes,
                       kind == 7 ? input.number<std::uint32_t>() : static_cast<std::uint32_t>(sent.size()));
    bytes.insert(bytes.end(), sent.begin(), sent.end());
  }
  return bytes;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static Endpoint endpoint;
  Input input(data, size);
  std::array<std::vector<std::byte>, kPeers> streams;
  std::array<FileDescriptor, kPeers> sockets;
  std::array<std::size_t, kPeers> sent{};
  for (std::size_t peer = 0; peer < kPeers; ++peer) {
    streams[peer] = streamOf(input);
    sockets[peer] = endpoint.connect();
  }
  const auto send = [&](std::size_t peer, std::size_t most) {
    const auto slice = std::span(streams[peer]).subspan(sent[peer]);
    const ssize_t count =
        ::send(sockets[peer].get(), slice.data(), std::min(most, slice.size()), MSG_DONTWAIT);
    if (count > 0) sent[peer] += static_cast<std::size_t>(count);
    if (count < 0) sent[peer] = streams[peer].size();  // its connection was ended
    endpoint.serve();
  };
  while (!input.isEmpty()) {
    const std::size_t peer = input.below(kPeers);
    send(peer, 1U + input.number<std::uint8_t>());
  }
  for (std::size_t peer = 0; peer < kPeers; ++peer) {
    while (sent[peer] < streams[peer].size()) send(peer, 4096);
    sockets[peer] = {};
  }
  endpoint.serve();
  const auto received = endpoint.take();
  require(received.size() == kPeers, "every peer is served");
  std::size_t peer = 0;
  for (const auto& [connection, got] : received)
    require(got == receivedFrom(streams[peer++]), "a peer's messages are those of its own bytes");
  return 0;
}
