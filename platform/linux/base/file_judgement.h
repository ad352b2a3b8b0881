// How the door to the device's files opens, and what it thinks of what it opened.
#pragma once

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "platform/linux/base/file_io.h"

namespace tbdaily {

// Nothing waits for the other end of a pipe, and no terminal becomes the process's own.
inline constexpr int kOpenFile = O_CLOEXEC | O_NONBLOCK | O_NOCTTY;
inline constexpr int kOpenFolder = O_RDONLY | O_DIRECTORY | O_CLOEXEC;

inline uid_t processUser() {
  static const uid_t user = ::geteuid();
  return user;
}

// The file that was opened is what its place asks for.
inline int judgeOpenFile(int file, bool isWrittenInPlace) {
  struct stat status {};
  if (::fstat(file, &status) != 0) return errno;
  if (!S_ISREG(status.st_mode)) return kNotARegularFile;
  return isWrittenInPlace && status.st_nlink > 1 ? kSecondName : 0;
}

// What opening without following links failed with, by its reason.
inline int openingError(int error) {
  if (error == ELOOP) return kLinkInPlace;
  return error == ENXIO || error == EISDIR ? kNotARegularFile : error;
}

}  // namespace tbdaily
