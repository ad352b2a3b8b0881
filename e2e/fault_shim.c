// Preloaded into a program, makes its Nth call of a kind below the device root go wrong.
//
// TBDAILY_ROOT is the root (an absolute path without links), FAULT_AT is N, and FAULT_MODE says what goes
// wrong:
//   kill        the process ends with status 77 in place of the Nth call that changes something
//   error       that call fails with EIO
//   full        the Nth call that needs room and all later ones fail with ENOSPC, the first write
//   half-written short       the Nth write takes half of its bytes and says so unreadable  the Nth opening of
//   what is there, or reading from it, fails with EIO
// The file FAULT_MARK is made when it happens.
//
// With FAULT_JOURNAL, a folder, what was forced to storage is kept there: the file "calls" has a line for
// each change of a folder and each forcing, and beside it lie the contents that were forced, one file each.
//   made     FOLDER NAME INODE f|d        named    FOLDER NAME INODE (a further name)
//   renamed  FOLDER NAME FOLDER NAME INODE   removed  FOLDER NAME
//   forced   INODE CONTENTS               forcedFolder  INODE
#define _GNU_SOURCE
#include <dlfcn.h>
#include <errno.h>
#include <fcntl.h>
#include <limits.h>
#include <pthread.h>
#include <stdarg.h>
#include <stdatomic.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

enum Kind { CHANGES, NEEDS_ROOM, WRITES, READS };
enum { KILLED = 77, COUNTED_LOG_CALLS = 3 };

// ---- The kernel, past the functions of this file

static long (*kernel)(long number, ...);

__attribute__((constructor)) static void findKernel(void) {
  *(void**)&kernel = dlsym(RTLD_NEXT, "syscall");
}

static int rawOpen(const char* path, int flags) {
  return (int)kernel(SYS_openat, AT_FDCWD, path, flags | O_CLOEXEC, 0600);
}

// ---- Paths

static int linkOf(int fd, char path[PATH_MAX]) {
  char link[64];
  snprintf(link, sizeof link, "/proc/self/fd/%d", fd);
  const long length = kernel(SYS_readlinkat, AT_FDCWD, link, path, PATH_MAX - 1);
  if (length < 0) return 0;
  path[length] = '\0';
  return 1;
}

// The whole path of a name in an open folder; of "/proc/self/fd/N/NAME" that in the folder N.
static int resolve(int folder, const char* name, char path[PATH_MAX]) {
  int at = 0;
  if (sscanf(name, "/proc/self/fd/%d/%n", &folder, &at) == 1 && at > 0) name += at;
  if (name[0] == '/') return snprintf(path, PATH_MAX, "%s", name) < PATH_MAX;
  if (folder == AT_FDCWD || !linkOf(folder, path)) return 0;
  const size_t length = strlen(path);
  return snprintf(path + length, PATH_MAX - length, "/%s", name) < (int)(PATH_MAX - length);
}

static int isBelowRoot(const char* path) {
  const char* root = getenv("TBDAILY_ROOT");
  const size_t length = root != NULL ? strlen(root) : 0;
  return length > 0 && strncmp(path, root, length) == 0 && (path[length] == '/' || path[length] == '\0');
}

// ---- Faults

static int isCounted(const char* mode, enum Kind kind) {
  if (strcmp(mode, "full") == 0) return kind == NEEDS_ROOM || kind == WRITES;
  if (strcmp(mode, "short") == 0) return kind == WRITES;
  if (strcmp(mode, "unreadable") == 0) return kind == READS;
  return kind != READS;
}

// Whether this call goes wrong, with errno set. Does not return when the process is to end here.
static int goesWrong(const char* path, enum Kind kind) {
  static atomic_int calls, logCalls;
  const char* mode = getenv("FAULT_MODE");
  const char* at = getenv("FAULT_AT");
  if (mode == NULL || at == NULL || !isBelowRoot(path) || !isCounted(mode, kind)) return 0;
  // Recordings stand for a host that is not there.
  if (kind == READS && strstr(path, "/System/Device/") != NULL) return 0;
  // The log is line after line, all alike.
  if (strstr(path, "/var/log/") != NULL && atomic_fetch_add(&logCalls, 1) >= COUNTED_LOG_CALLS) return 0;
  const int call = atomic_fetch_add(&calls, 1) + 1;
  const int isFull = strcmp(mode, "full") == 0;
  if (isFull ? call < atoi(at) : call != atoi(at)) return 0;
  const int mark = rawOpen(getenv("FAULT_MARK"), O_CREAT | O_WRONLY | O_APPEND);
  kernel(SYS_write, mark, path, strlen(path));
  kernel(SYS_write, mark, "\n", (size_t)1);
  kernel(SYS_close, mark);
  if (strcmp(mode, "kill") == 0) _exit(KILLED);
  errno = isFull ? ENOSPC : EIO;
  return 1;
}

static int descriptorGoesWrong(int fd, enum Kind kind) {
  char path[PATH_MAX];
  return linkOf(fd, path) && goesWrong(path, kind);
}

static int nameGoesWrong(int folder, const char* name, enum Kind kind) {
  char path[PATH_MAX];
  return resolve(folder, name, path) && goesWrong(path, kind);
}

// ---- The journal

static pthread_mutex_t journalMutex = PTHREAD_MUTEX_INITIALIZER;

// Opens a file of the journal; -1 when there is none.
static int openJournal(const char* name, int flags) {
  char path[PATH_MAX];
  const char* journal = getenv("FAULT_JOURNAL");
  if (journal == NULL || snprintf(path, sizeof path, "%s/%s", journal, name) >= (int)sizeof path) return -1;
  return rawOpen(path, flags);
}

static void note(const char* format, ...) {
  char line[2 * PATH_MAX];
  const int journal = openJournal("calls", O_CREAT | O_WRONLY | O_APPEND);
  if (journal < 0) return;
  va_list arguments;
  va_start(arguments, format);
  const int length = vsnprintf(line, sizeof line, format, arguments);
  va_end(arguments);
  kernel(SYS_write, journal, line, (size_t)length);
  kernel(SYS_close, journal);
}

// A name, and the inodes of its folder and of what it leads to (0: nothing).
struct Entry {
  char path[PATH_MAX];
  const char* name;
  unsigned long long folder, inode;
  int isFolder;
};

// False for what is not journaled.
static int look(int folder, const char* name, struct Entry* entry) {
  if (getenv("FAULT_JOURNAL") == NULL || !resolve(folder, name, entry->path) || !isBelowRoot(entry->path))
    return 0;
  const int error = errno;
  struct stat status;
  const int isThere = lstat(entry->path, &status) == 0;
  entry->inode = isThere ? status.st_ino : 0;
  entry->isFolder = isThere && S_ISDIR(status.st_mode);
  char* cut = strrchr(entry->path, '/');
  entry->name = cut + 1;
  *cut = '\0';
  const int isFolderThere = lstat(entry->path, &status) == 0;
  entry->folder = status.st_ino;
  errno = error;
  return isFolderThere;
}

static void noteMade(int folder, const char* name) {
  struct Entry entry;
  if (look(folder, name, &entry))
    note("made\t%llu\t%s\t%llu\t%c\n", entry.folder, entry.name, entry.inode, entry.isFolder ? 'd' : 'f');
}

static void keepContents(int fd, const char* copy) {
  char path[64], block[1 << 14];
  snprintf(path, sizeof path, "/proc/self/fd/%d", fd);
  const int from = rawOpen(path, O_RDONLY), to = openJournal(copy, O_CREAT | O_WRONLY);
  for (long size; (size = kernel(SYS_read, from, block, sizeof block)) > 0;)
    kernel(SYS_write, to, block, size);
  kernel(SYS_close, from);
  kernel(SYS_close, to);
}

static void noteForced(int fd) {
  static int copies;
  struct stat status;
  char path[PATH_MAX], copy[32];
  if (getenv("FAULT_JOURNAL") == NULL || !linkOf(fd, path) || !isBelowRoot(path) || fstat(fd, &status) != 0)
    return;
  if (S_ISDIR(status.st_mode)) return note("forcedFolder\t%llu\n", (unsigned long long)status.st_ino);
  pthread_mutex_lock(&journalMutex);
  snprintf(copy, sizeof copy, "%d", ++copies);
  keepContents(fd, copy);
  note("forced\t%llu\t%s\n", (unsigned long long)status.st_ino, copy);
  pthread_mutex_unlock(&journalMutex);
}

// ---- Contents

static int isShort(void) {
  const char* mode = getenv("FAULT_MODE");
  return mode != NULL && strcmp(mode, "short") == 0;
}

// How much of a write is made; -1 when none is, with errno set.
static ssize_t sizeToWrite(int fd, size_t size) {
  static atomic_int halfWritten;
  if (isShort() && size < 2) return (ssize_t)size;
  if (!descriptorGoesWrong(fd, WRITES)) return (ssize_t)size;
  if (isShort()) return (ssize_t)(size / 2);
  const int isHalf = errno == ENOSPC && size >= 2 && !atomic_exchange(&halfWritten, 1);
  return isHalf ? (ssize_t)(size / 2) : -1;
}

ssize_t write(int fd, const void* bytes, size_t size) {
  const ssize_t part = sizeToWrite(fd, size);
  return part < 0 ? -1 : kernel(SYS_write, fd, bytes, (size_t)part);
}
ssize_t pwrite(int fd, const void* bytes, size_t size, off_t offset) {
  const ssize_t part = sizeToWrite(fd, size);
  return part < 0 ? -1 : kernel(SYS_pwrite64, fd, bytes, (size_t)part, offset);
}
ssize_t pwrite64(int fd, const void* bytes, size_t size, off_t offset) __attribute__((alias("pwrite")));

int ftruncate(int fd, off_t size) {
  return descriptorGoesWrong(fd, CHANGES) ? -1 : (int)kernel(SYS_ftruncate, fd, size);
}
int ftruncate64(int fd, off_t size) __attribute__((alias("ftruncate")));

ssize_t read(int fd, void* bytes, size_t size) {
  return descriptorGoesWrong(fd, READS) ? -1 : kernel(SYS_read, fd, bytes, size);
}
ssize_t pread(int fd, void* bytes, size_t size, off_t offset) {
  return descriptorGoesWrong(fd, READS) ? -1 : kernel(SYS_pread64, fd, bytes, size, offset);
}
ssize_t pread64(int fd, void* bytes, size_t size, off_t offset) __attribute__((alias("pread")));

static int force(long number, int fd) {
  if (descriptorGoesWrong(fd, CHANGES)) return -1;
  const int result = (int)kernel(number, fd);
  if (result == 0) noteForced(fd);
  return result;
}
int fsync(int fd) {
  return force(SYS_fsync, fd);
}
int fdatasync(int fd) {
  return force(SYS_fdatasync, fd);
}

// ---- Names

static int openName(int folder, const char* path, int flags, unsigned mode) {
  const int exists = kernel(SYS_faccessat, folder, path, F_OK) == 0;
  const int isMade = (flags & O_CREAT) != 0 && !exists;
  if ((isMade || exists) && nameGoesWrong(folder, path, isMade ? NEEDS_ROOM : READS)) return -1;
  const int fd = (int)kernel(SYS_openat, folder, path, flags, mode);
  if (fd >= 0 && isMade) noteMade(folder, path);
  return fd;
}

static unsigned modeOf(int flags, va_list arguments) {
  return (flags & O_CREAT) != 0 ? va_arg(arguments, unsigned) : 0;
}

int openat(int folder, const char* path, int flags, ...) {
  va_list arguments;
  va_start(arguments, flags);
  const unsigned mode = modeOf(flags, arguments);
  va_end(arguments);
  return openName(folder, path, flags, mode);
}
int openat64(int folder, const char* path, int flags, ...) __attribute__((alias("openat")));

int open(const char* path, int flags, ...) {
  va_list arguments;
  va_start(arguments, flags);
  const unsigned mode = modeOf(flags, arguments);
  va_end(arguments);
  return openName(AT_FDCWD, path, flags, mode);
}
int open64(const char* path, int flags, ...) __attribute__((alias("open")));

// The program's openat2 only opens what is there.
long syscall(long number, ...) {
  va_list arguments;
  long values[6];
  va_start(arguments, number);
  for (int i = 0; i < 6; ++i) values[i] = va_arg(arguments, long);
  va_end(arguments);
  if (kernel == NULL) findKernel();
  if (number == SYS_openat2) {
    const char* path = (const char*)values[1];
    const int exists = kernel(SYS_faccessat, (int)values[0], path, F_OK) == 0;
    if (exists && nameGoesWrong((int)values[0], path, READS)) return -1;
  }
  return kernel(number, values[0], values[1], values[2], values[3], values[4], values[5]);
}

int mkdirat(int folder, const char* name, mode_t mode) {
  if (nameGoesWrong(folder, name, NEEDS_ROOM)) return -1;
  const int result = (int)kernel(SYS_mkdirat, folder, name, mode);
  if (result == 0) noteMade(folder, name);
  return result;
}
int mkdir(const char* path, mode_t mode) {
  return mkdirat(AT_FDCWD, path, mode);
}

int mknodat(int folder, const char* name, mode_t mode, dev_t device) {
  if (nameGoesWrong(folder, name, NEEDS_ROOM)) return -1;
  const int result = (int)kernel(SYS_mknodat, folder, name, mode, device);
  if (result == 0) noteMade(folder, name);
  return result;
}

int linkat(int from, const char* name, int to, const char* newName, int flags) {
  if (nameGoesWrong(to, newName, NEEDS_ROOM)) return -1;
  const int result = (int)kernel(SYS_linkat, from, name, to, newName, flags);
  struct Entry entry;
  if (result == 0 && look(to, newName, &entry))
    note("named\t%llu\t%s\t%llu\n", entry.folder, entry.name, entry.inode);
  return result;
}
int link(const char* from, const char* to) {
  return linkat(AT_FDCWD, from, AT_FDCWD, to, 0);
}

int renameat(int from, const char* name, int to, const char* newName) {
  if (nameGoesWrong(to, newName, CHANGES)) return -1;
  struct Entry before, after;
  const int isJournaled = look(from, name, &before);
  const int result = (int)kernel(SYS_renameat2, from, name, to, newName, 0);
  if (result == 0 && isJournaled && look(to, newName, &after)) {
    note("renamed\t%llu\t%s\t%llu\t%s\t%llu\n", before.folder, before.name, after.folder, after.name,
         after.inode);
  }
  return result;
}
int rename(const char* from, const char* to) {
  return renameat(AT_FDCWD, from, AT_FDCWD, to);
}

int unlinkat(int folder, const char* name, int flags) {
  if (nameGoesWrong(folder, name, CHANGES)) return -1;
  struct Entry entry;
  const int isJournaled = look(folder, name, &entry);
  const int result = (int)kernel(SYS_unlinkat, folder, name, flags);
  if (result == 0 && isJournaled) note("removed\t%llu\t%s\n", entry.folder, entry.name);
  return result;
}
int unlink(const char* path) {
  return unlinkat(AT_FDCWD, path, 0);
}
