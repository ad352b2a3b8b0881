// Preloaded into a program, makes its Nth call that changes something under the device root go wrong.
//
// TBDAILY_ROOT is the root, FAULT_AT is N, and FAULT_MODE says how: "error" (the call fails with EIO), "full"
// (the Nth call and all later ones that need room fail with ENOSPC, a write after half of its bytes), "kill"
// (the process ends with status 77 in place of the call). The file FAULT_MARK is made when it happens.
#define _GNU_SOURCE
#include <dlfcn.h>
#include <errno.h>
#include <fcntl.h>
#include <limits.h>
#include <stdarg.h>
#include <stdatomic.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

enum Need { NEEDS_NOTHING, NEEDS_ROOM };

// Whether this call goes wrong, with errno set. Does not return when the process is to end here.
static int goesWrong(const char* path, enum Need need) {
  static atomic_int calls;
  const char* root = getenv("TBDAILY_ROOT");
  const char* mode = getenv("FAULT_MODE");
  const char* at = getenv("FAULT_AT");
  if (root == NULL || mode == NULL || at == NULL || strncmp(path, root, strlen(root)) != 0) return 0;
  const int call = atomic_fetch_add(&calls, 1) + 1;
  const int full = strcmp(mode, "full") == 0;
  if (full ? call < atoi(at) || need != NEEDS_ROOM : call != atoi(at)) return 0;
  syscall(SYS_close, syscall(SYS_openat, AT_FDCWD, getenv("FAULT_MARK"), O_CREAT | O_WRONLY, 0600));
  if (strcmp(mode, "kill") == 0) _exit(77);
  errno = full ? ENOSPC : EIO;
  return 1;
}

static int descriptorGoesWrong(int fd, enum Need need) {
  char link[64], path[PATH_MAX];
  snprintf(link, sizeof link, "/proc/self/fd/%d", fd);
  const ssize_t length = syscall(SYS_readlinkat, AT_FDCWD, link, path, sizeof path - 1);
  if (length < 0) return 0;
  path[length] = '\0';
  if (strstr(path, "/var/log/") != NULL) return 0;  // line after line, all alike
  return goesWrong(path, need);
}

ssize_t write(int fd, const void* bytes, size_t size) {
  static atomic_int halfWritten;
  if (descriptorGoesWrong(fd, NEEDS_ROOM)) {
    if (errno != ENOSPC || size < 2 || atomic_exchange(&halfWritten, 1)) return -1;
    size /= 2;
  }
  return syscall(SYS_write, fd, bytes, size);
}

ssize_t pwrite(int fd, const void* bytes, size_t size, off_t offset) {
  return descriptorGoesWrong(fd, NEEDS_ROOM) ? -1 : syscall(SYS_pwrite64, fd, bytes, size, offset);
}
ssize_t pwrite64(int fd, const void* bytes, size_t size, off_t offset) __attribute__((alias("pwrite")));

int ftruncate(int fd, off_t size) {
  return descriptorGoesWrong(fd, NEEDS_NOTHING) ? -1 : (int)syscall(SYS_ftruncate, fd, size);
}
int ftruncate64(int fd, off_t size) __attribute__((alias("ftruncate")));

int fsync(int fd) {
  return descriptorGoesWrong(fd, NEEDS_NOTHING) ? -1 : (int)syscall(SYS_fsync, fd);
}
int fdatasync(int fd) {
  return descriptorGoesWrong(fd, NEEDS_NOTHING) ? -1 : (int)syscall(SYS_fdatasync, fd);
}

int open(const char* path, int flags, ...) {
  va_list arguments;
  va_start(arguments, flags);
  const unsigned mode = (flags & O_CREAT) != 0 ? va_arg(arguments, unsigned) : 0;
  va_end(arguments);
  if ((flags & O_CREAT) != 0 && goesWrong(path, NEEDS_ROOM)) return -1;
  return (int)syscall(SYS_openat, AT_FDCWD, path, flags, mode);
}
int open64(const char* path, int flags, ...) __attribute__((alias("open")));

int mkostemp(char* path, int flags) {
  if (goesWrong(path, NEEDS_ROOM)) return -1;
  int (*real)(char*, int);
  *(void**)&real = dlsym(RTLD_NEXT, "mkostemp");
  return real(path, flags);
}

int mkdir(const char* path, mode_t mode) {
  return goesWrong(path, NEEDS_ROOM) ? -1 : (int)syscall(SYS_mkdirat, AT_FDCWD, path, mode);
}
int link(const char* from, const char* to) {
  return goesWrong(to, NEEDS_ROOM) ? -1 : (int)syscall(SYS_linkat, AT_FDCWD, from, AT_FDCWD, to, 0);
}
int rename(const char* from, const char* to) {
  return goesWrong(to, NEEDS_NOTHING) ? -1 : (int)syscall(SYS_renameat2, AT_FDCWD, from, AT_FDCWD, to, 0);
}
int unlink(const char* path) {
  return goesWrong(path, NEEDS_NOTHING) ? -1 : (int)syscall(SYS_unlinkat, AT_FDCWD, path, 0);
}
