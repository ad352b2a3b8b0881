// Preloaded into a program, makes its Nth request for memory fail, counted from the start of main.
//
// FAULT_AT is N; the file FAULT_MARK is made when it happens. With FAULT_SITES, a file, each request that
// comes by a way through the program that none before it came by is written there instead: its number, one a
// line.
#define _GNU_SOURCE
#include <dlfcn.h>
#include <errno.h>
#include <execinfo.h>
#include <fcntl.h>
#include <pthread.h>
#include <stdatomic.h>
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/syscall.h>
#include <unistd.h>

extern void* __libc_malloc(size_t size);
extern void* __libc_calloc(size_t count, size_t size);
extern void* __libc_realloc(void* memory, size_t size);
extern void* __libc_memalign(size_t alignment, size_t size);

enum { MOST_FRAMES = 64, OWN_FRAMES = 2, TABLE = 1 << 16 };

static atomic_int isCounting, requests;
static int failing, sites = -1;
static int (*programMain)(int, char**, char**);

// ---- Ways through the program

static pthread_mutex_t sitesMutex = PTHREAD_MUTEX_INITIALIZER;
static __thread int isNoting;

static int isNewWay(void* const* frames, int count) {
  static uint64_t known[TABLE];
  uint64_t hash = 14695981039346656037u;
  for (int i = OWN_FRAMES; i < count; ++i) hash = (hash ^ (uint64_t)(uintptr_t)frames[i]) * 1099511628211u;
  hash |= 1;
  for (size_t at = hash >> 48;; ++at) {
    uint64_t* place = &known[at % TABLE];
    if (*place == hash) return 0;
    if (*place != 0) continue;
    *place = hash;
    return 1;
  }
}

static void noteSite(int request) {
  void* frames[MOST_FRAMES];
  char line[16];
  if (isNoting) return;
  isNoting = 1;
  pthread_mutex_lock(&sitesMutex);
  if (isNewWay(frames, backtrace(frames, MOST_FRAMES))) {
    const int length = snprintf(line, sizeof line, "%d\n", request);
    syscall(SYS_write, sites, line, length);
  }
  pthread_mutex_unlock(&sitesMutex);
  isNoting = 0;
}

// ---- Requests

static int goesWrong(void) {
  if (!isCounting || isNoting) return 0;
  const int request = atomic_fetch_add(&requests, 1) + 1;
  if (sites >= 0) noteSite(request);
  if (request != failing) return 0;
  syscall(SYS_close, syscall(SYS_openat, AT_FDCWD, getenv("FAULT_MARK"), O_CREAT | O_WRONLY, 0600));
  errno = ENOMEM;
  return 1;
}

void* malloc(size_t size) {
  return goesWrong() ? NULL : __libc_malloc(size);
}
void* calloc(size_t count, size_t size) {
  return goesWrong() ? NULL : __libc_calloc(count, size);
}
void* realloc(void* memory, size_t size) {
  return size != 0 && goesWrong() ? NULL : __libc_realloc(memory, size);
}
void* memalign(size_t alignment, size_t size) {
  return goesWrong() ? NULL : __libc_memalign(alignment, size);
}
void* aligned_alloc(size_t alignment, size_t size) {
  return memalign(alignment, size);
}
int posix_memalign(void** memory, size_t alignment, size_t size) {
  void* got = memalign(alignment, size);
  if (got == NULL) return ENOMEM;
  *memory = got;
  return 0;
}

// ---- The start of main

static int mainCounted(int count, char** arguments, char** environment) {
  const char* at = getenv("FAULT_AT");
  const char* place = getenv("FAULT_SITES");
  void* frame[1];
  backtrace(frame, 1);  // loads what it needs
  failing = at != NULL ? atoi(at) : 0;
  if (place != NULL) sites = (int)syscall(SYS_openat, AT_FDCWD, place, O_CREAT | O_WRONLY | O_CLOEXEC, 0600);
  isCounting = 1;
  return programMain(count, arguments, environment);
}

int __libc_start_main(int (*main)(int, char**, char**), int count, char** arguments, void (*init)(void),
                      void (*fini)(void), void (*loaderFini)(void), void* stackEnd) {
  int (*real)(int (*)(int, char**, char**), int, char**, void (*)(void), void (*)(void), void (*)(void),
              void*);
  *(void**)&real = dlsym(RTLD_NEXT, "__libc_start_main");
  programMain = main;
  return real(mainCounted, count, arguments, init, fini, loaderFini, stackEnd);
}
