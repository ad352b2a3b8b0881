// Unix stream sockets in folders of the device, at paths of any length.
#pragma once

#include <string>

#include "platform/linux/base/device_files.h"

namespace tbdaily {

// Results of a socket call: an open socket, or an errno value.
struct SocketResult {
  FileDescriptor socket;
  int error = 0;
};

// A connection to the socket of this name.
SocketResult connectUnixSocket(const DeviceFolder& folder, const std::string& name);

// A listening, non-blocking socket of mode 0600 with this name, in the place of whatever has it. It appears
// when it can be connected to; the caller sees to it that nobody else makes it at the same time.
SocketResult listenUnixSocket(const DeviceFolder& folder, const std::string& name);

// The first listening Unix stream socket that the service manager passed to this process (LISTEN_PID,
// LISTEN_FDS); not open when there is none.
FileDescriptor takePassedListener();

// Whether the peer runs as this process's user or as root.
bool isTrustedPeer(int socket);

}  // namespace tbdaily
