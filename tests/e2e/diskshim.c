/* Records what a program does to the files of one folder, or lets one such call fail. Preloaded.
 *
 * DISK_FOLDER  path prefix of the files in question
 * DISK_LOG     a file to which every change is appended: lines "OPERATION NUMBERS", paths in quotes;
 *              the bytes of a write follow their line, and a newline
 * DISK_FAULT   "CALL NUMBER REASON": the call of that number, from 1, fails; REASON is a number of
 *              errno, "short", which writes half of the bytes asked for, or "kill", which kills the
 *              program instead
 * DISK_CALLS   a file to which every call is appended: lines "CALL NUMBER PLACE"; calls that the same
 *              functions of the program led to have the same place
 */
/* SPDX-License-Identifier: MIT */
#define _GNU_SOURCE
#include <dlfcn.h>
#include <errno.h>
#include <execinfo.h>
#include <fcntl.h>
#include <pthread.h>
#include <signal.h>
#include <stdarg.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#define NEXT(name) ((__typeof__(&name))dlsym(RTLD_NEXT, #name))
#define MOST_FILES 1024
#define MOST_FRAMES 7

enum Call { kOpen, kPwrite, kFsync, kFtruncate, kRename, kUnlink, kFlock, kFutimens, kClose, kPread, kCalls };
static const char *const kNames[kCalls] = {"open",   "pwrite", "fsync",    "ftruncate", "rename",
                                           "unlink", "flock",  "futimens", "close",     "pread"};

static pthread_mutex_t mutex = PTHREAD_MUTEX_INITIALIZER;
static char *paths[MOST_FILES]; /* by descriptor; null: not one of ours */
static unsigned long counts[kCalls];
static int logFile = -1;

static int IsOurs(const char *path) {
  const char *folder = getenv("DISK_FOLDER");
  return folder && path && strncmp(path, folder, strlen(folder)) == 0;
}

static const char *PathOf(int descriptor) {
  return descriptor >= 0 && descriptor < MOST_FILES ? paths[descriptor] : NULL;
}

static void NoteCall(enum Call call) {
  static FILE *file;
  const char *name = getenv("DISK_CALLS");
  void *frames[MOST_FRAMES];
  unsigned long place = 5381;
  if (!name) return;
  if (!file) file = fopen(name, "a");
  if (!file) abort();
  for (int i = backtrace(frames, MOST_FRAMES); i > 0; --i)
    place = place * 33 + (unsigned long)frames[i - 1];
  fprintf(file, "%s %lu %lx\n", kNames[call], counts[call], place);
}

/* -1: goes on; otherwise the reason, 0 for a short write. */
static int FaultOf(enum Call call) {
  const char *fault = getenv("DISK_FAULT");
  char name[16], reason[16];
  unsigned long number;
  ++counts[call];
  NoteCall(call);
  if (!fault || sscanf(fault, "%15s %lu %15s", name, &number, reason) != 3) return -1;
  if (strcmp(name, kNames[call]) != 0 || counts[call] != number) return -1;
  if (strcmp(reason, "kill") == 0) kill(getpid(), SIGKILL);
  return strcmp(reason, "short") == 0 ? 0 : atoi(reason);
}

static void WriteAll(const void *bytes, size_t count) {
  const char *from = bytes;
  while (count > 0) {
    const ssize_t put = NEXT(write)(logFile, from, count);
    if (put <= 0) abort();
    from += put;
    count -= (size_t)put;
  }
}

static void Log(const void *bytes, size_t count, const char *format, ...) {
  char line[4096];
  va_list arguments;
  const char *name = getenv("DISK_LOG");
  if (!name) return;
  if (logFile < 0) logFile = NEXT(open)(name, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0666);
  if (logFile < 0) abort();
  va_start(arguments, format);
  vsnprintf(line, sizeof line, format, arguments);
  va_end(arguments);
  WriteAll(line, strlen(line));
  if (!bytes) return;
  WriteAll(bytes, count);
  WriteAll("\n", 1);
}

/* The guarded part of a call on a file of ours: `act` is what the call does. */
#define GUARDED(call, isOurs, act)   \
  if (!(isOurs)) return act;         \
  pthread_mutex_lock(&mutex);        \
  const int fault = FaultOf(call);   \
  if (fault > 0) {                   \
    pthread_mutex_unlock(&mutex);    \
    errno = fault;                   \
    return -1;                       \
  }                                  \
  (void)fault

static int OpenWith(const char *path, int flags, mode_t mode) {
  GUARDED(kOpen, IsOurs(path), NEXT(open)(path, flags, mode));
  const int descriptor = NEXT(open)(path, flags, mode);
  if (descriptor >= 0 && descriptor < MOST_FILES) {
    free(paths[descriptor]);
    paths[descriptor] = strdup(path);
    if (flags & O_CREAT) Log(NULL, 0, "create \"%s\"\n", path);
  }
  pthread_mutex_unlock(&mutex);
  return descriptor;
}

int open(const char *path, int flags, ...) {
  va_list arguments;
  va_start(arguments, flags);
  const mode_t mode = flags & O_CREAT ? va_arg(arguments, mode_t) : 0;
  va_end(arguments);
  return OpenWith(path, flags, mode);
}

int open64(const char *path, int flags, ...) {
  va_list arguments;
  va_start(arguments, flags);
  const mode_t mode = flags & O_CREAT ? va_arg(arguments, mode_t) : 0;
  va_end(arguments);
  return OpenWith(path, flags, mode);
}

int close(int descriptor) {
  GUARDED(kClose, PathOf(descriptor), NEXT(close)(descriptor));
  free(paths[descriptor]);
  paths[descriptor] = NULL;
  const int answer = NEXT(close)(descriptor);
  pthread_mutex_unlock(&mutex);
  return answer;
}

ssize_t pread64(int descriptor, void *bytes, size_t count, off64_t position) {
  GUARDED(kPread, PathOf(descriptor), NEXT(pread64)(descriptor, bytes, count, position));
  pthread_mutex_unlock(&mutex);
  return NEXT(pread64)(descriptor, bytes, count, position);
}

ssize_t pread(int descriptor, void *bytes, size_t count, off_t position) {
  return pread64(descriptor, bytes, count, position);
}

ssize_t pwrite64(int descriptor, const void *bytes, size_t count, off64_t position) {
  GUARDED(kPwrite, PathOf(descriptor), NEXT(pwrite64)(descriptor, bytes, count, position));
  if (fault == 0 && count > 1) count /= 2;
  const ssize_t put = NEXT(pwrite64)(descriptor, bytes, count, position);
  if (put > 0)
    Log(bytes, (size_t)put, "pwrite %lld %zd \"%s\"\n", (long long)position, put,
        paths[descriptor]);
  pthread_mutex_unlock(&mutex);
  return put;
}

ssize_t pwrite(int descriptor, const void *bytes, size_t count, off_t position) {
  return pwrite64(descriptor, bytes, count, position);
}

int fsync(int descriptor) {
  GUARDED(kFsync, PathOf(descriptor), NEXT(fsync)(descriptor));
  const int answer = NEXT(fsync)(descriptor);
  if (answer == 0) Log(NULL, 0, "fsync \"%s\"\n", paths[descriptor]);
  pthread_mutex_unlock(&mutex);
  return answer;
}

int ftruncate64(int descriptor, off64_t size) {
  GUARDED(kFtruncate, PathOf(descriptor), NEXT(ftruncate64)(descriptor, size));
  const int answer = NEXT(ftruncate64)(descriptor, size);
  if (answer == 0) Log(NULL, 0, "ftruncate %lld \"%s\"\n", (long long)size, paths[descriptor]);
  pthread_mutex_unlock(&mutex);
  return answer;
}

int ftruncate(int descriptor, off_t size) { return ftruncate64(descriptor, size); }

static int Renamed(const char *from, const char *to, unsigned flags) {
  GUARDED(kRename, IsOurs(from), NEXT(renameat2)(AT_FDCWD, from, AT_FDCWD, to, flags));
  const int answer = NEXT(renameat2)(AT_FDCWD, from, AT_FDCWD, to, flags);
  if (answer == 0) Log(NULL, 0, "rename \"%s\" \"%s\"\n", from, to);
  pthread_mutex_unlock(&mutex);
  return answer;
}

int renameat2(int fromFolder, const char *from, int toFolder, const char *to, unsigned flags) {
  if (fromFolder != AT_FDCWD || toFolder != AT_FDCWD)
    return NEXT(renameat2)(fromFolder, from, toFolder, to, flags);
  return Renamed(from, to, flags);
}

int rename(const char *from, const char *to) { return Renamed(from, to, 0); }

static int Removed(const char *path) {
  GUARDED(kUnlink, IsOurs(path), NEXT(unlink)(path));
  const int answer = NEXT(unlink)(path);
  if (answer == 0) Log(NULL, 0, "unlink \"%s\"\n", path);
  pthread_mutex_unlock(&mutex);
  return answer;
}

int unlink(const char *path) { return Removed(path); }
int remove(const char *path) { return Removed(path); } /* files only: nothing else is removed here */

int flock(int descriptor, int operation) {
  GUARDED(kFlock, PathOf(descriptor), NEXT(flock)(descriptor, operation));
  pthread_mutex_unlock(&mutex);
  return NEXT(flock)(descriptor, operation);
}

int futimens(int descriptor, const struct timespec times[2]) {
  GUARDED(kFutimens, PathOf(descriptor), NEXT(futimens)(descriptor, times));
  pthread_mutex_unlock(&mutex);
  return NEXT(futimens)(descriptor, times);
}
