// Unix stream sockets at paths of any length.
#pragma once

#include <filesystem>

#include "platform/linux/base/file_io.h"

namespace tbdaily {

// Results of a socket call: an open socket, or an errno value.
struct SocketResult {
  FileDescriptor socket;
  int error = 0;
};

// A connection to the socket at the path.
SocketResult connectUnixSocket(const std::filesystem::path& path);

// A listening, non-blocking socket of mode 0600 at the path, in the place of whatever is there. It appears
// when it can be connected to; the caller sees to it that nobody else makes it at the same time.
SocketResult listenUnixSocket(const std::filesystem::path& path);

// The first listening Unix stream socket that the service manager passed to this process (LISTEN_PID,
// LISTEN_FDS); not open when there is none.
FileDescriptor takePassedListener();

// Whether the peer runs as this process's user or as root.
bool isTrustedPeer(int socket);

}  // namespace tbdaily
