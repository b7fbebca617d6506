// preload.c: LD_PRELOAD library that removes one property of vornd. BREAK in the environment chooses which.
#define _GNU_SOURCE
#include <dlfcn.h>
#include <errno.h>
#include <stdlib.h>
#include <string.h>
#include <unistd.h>

static int broken(const char* what) {
  const char* chosen = getenv("BREAK");
  return chosen != NULL && strcmp(chosen, what) == 0;
}

// "sync": synchronisation has no effect, so data reach the disk only when the kernel writes them back.
int fsync(int fd) {
  int (*real)(int) = dlsym(RTLD_NEXT, "fsync");
  return broken("sync") ? 0 : real(fd);
}

int fdatasync(int fd) {
  int (*real)(int) = dlsym(RTLD_NEXT, "fdatasync");
  return broken("sync") ? 0 : real(fd);
}

// "temporary": temporary files are not removed.
int unlink(const char* path) {
  int (*real)(const char*) = dlsym(RTLD_NEXT, "unlink");
  return broken("temporary") && strstr(path, ".vorn-") != NULL ? 0 : real(path);
}

int unlinkat(int folder, const char* path, int flags) {
  int (*real)(int, const char*, int) = dlsym(RTLD_NEXT, "unlinkat");
  return broken("temporary") && strstr(path, ".vorn-") != NULL ? 0 : real(folder, path, flags);
}

// "full": a write to a full disk reports success.
ssize_t write(int fd, const void* data, size_t size) {
  ssize_t (*real)(int, const void*, size_t) = dlsym(RTLD_NEXT, "write");
  const ssize_t written = real(fd, data, size);
  return broken("full") && written < 0 && errno == ENOSPC ? (ssize_t)size : written;
}

// "firewall": rules are accepted but not loaded.
int nft_run_cmd_from_buffer(void* context, const char* commands) {
  int (*real)(void*, const char*) = dlsym(RTLD_NEXT, "nft_run_cmd_from_buffer");
  return broken("firewall") ? 0 : real(context, commands);
}
