#include "platform/linux/unix_socket.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <cstdlib>
#include <cstring>
#include <functional>

namespace tbdaily {

namespace {

// Calls the function with the address of a name in the folder, which is reached through its descriptor: paths
// of any length, and no other folder than that one.
int withAddress(const DeviceFolder& folder, const std::string& name,
                const std::function<int(const sockaddr*, socklen_t)>& call) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  const std::string text = folder.throughDescriptor(name).native();
  if (text.size() >= sizeof address.sun_path) return ENAMETOOLONG;
  std::memcpy(address.sun_path, text.c_str(), text.size() + 1);
  return call(reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0 ? 0 : errno;
}

std::int64_t numberInEnvironment(const char* variable) {
  const char* text = std::getenv(variable);
  std::int64_t number = 0;
  if (text != nullptr) std::from_chars(text, text + std::strlen(text), number);
  return number;
}

bool isListeningUnixStream(int fd) {
  const auto option = [fd](int name) {
    int value = -1;
    socklen_t size = sizeof value;
    return ::getsockopt(fd, SOL_SOCKET, name, &value, &size) == 0 ? value : -1;
  };
  return option(SO_DOMAIN) == AF_UNIX && option(SO_TYPE) == SOCK_STREAM && option(SO_ACCEPTCONN) == 1;
}

}  // namespace

SocketResult connectUnixSocket(const DeviceFolder& folder, const std::string& name) {
  FileDescriptor fd(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  if (!fd.isOpen()) return {FileDescriptor(), errno};
  const int error =
      withAddress(folder, name, [&fd](const sockaddr* a, socklen_t n) { return ::connect(fd.get(), a, n); });
  if (error != 0) return {FileDescriptor(), error};
  return {std::move(fd), 0};
}

SocketResult listenUnixSocket(const DeviceFolder& folder, const std::string& name) {
  FileDescriptor fd(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
  if (!fd.isOpen()) return {FileDescriptor(), errno};
  // Under another name until it listens: whoever sees the socket can connect to it.
  const std::string unready = name + ".starting";
  folder.remove(unready);
  const mode_t mask = ::umask(0177);
  int error =
      withAddress(folder, unready, [&fd](const sockaddr* a, socklen_t n) { return ::bind(fd.get(), a, n); });
  ::umask(mask);
  if (error != 0) return {FileDescriptor(), error};
  error = ::listen(fd.get(), SOMAXCONN) == 0 ? folder.rename(unready, folder, name) : errno;
  if (error != 0) {
    folder.remove(unready);
    return {FileDescriptor(), error};
  }
  return {std::move(fd), 0};
}

FileDescriptor takePassedListener() {
  constexpr int kFirstPassed = 3;
  constexpr std::int64_t kMostPassed = 64;
  if (numberInEnvironment("LISTEN_PID") != ::getpid()) return {};
  const std::int64_t count = std::min(numberInEnvironment("LISTEN_FDS"), kMostPassed);
  for (int fd = kFirstPassed; fd < kFirstPassed + count; ++fd) {
    if (!isListeningUnixStream(fd)) continue;
    ::fcntl(fd, F_SETFD, FD_CLOEXEC);
    ::fcntl(fd, F_SETFL, ::fcntl(fd, F_GETFL) | O_NONBLOCK);
    ::unsetenv("LISTEN_PID");
    ::unsetenv("LISTEN_FDS");
    return FileDescriptor(fd);
  }
  return {};
}

bool isTrustedPeer(int socket) {
  ucred credentials{};
  socklen_t size = sizeof credentials;
  if (::getsockopt(socket, SOL_SOCKET, SO_PEERCRED, &credentials, &size) != 0) return false;
  return credentials.uid == 0 || credentials.uid == ::geteuid();
}

}  // namespace tbdaily
