// An allocator that fails on demand, preloaded into vornd. The test controls it through a file that both map.
#include <fcntl.h>
#include <pthread.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>

#include "allocation_faults.h"

extern "C" {
// The C library's own allocator, under the names that it keeps for this purpose.
void* __libc_malloc(std::size_t size);                     // NOLINT(bugprone-reserved-identifier)
void* __libc_calloc(std::size_t count, std::size_t size);  // NOLINT(bugprone-reserved-identifier)
void* __libc_realloc(void* block, std::size_t size);       // NOLINT(bugprone-reserved-identifier)
}

namespace {

using vorn::server::AllocationFaults;

AllocationFaults* faults = nullptr;

// Runs before main, while the process has one thread.
__attribute__((constructor)) void MapFaults() {
  const char* path = std::getenv("VORN_TEST_ALLOCATION_FAULTS");
  const int file = path == nullptr ? -1 : open(path, O_RDWR | O_CLOEXEC);
  if (file < 0) return;
  void* page = mmap(nullptr, sizeof(AllocationFaults), PROT_READ | PROT_WRITE, MAP_SHARED, file, 0);
  close(file);
  if (page != MAP_FAILED) faults = static_cast<AllocationFaults*>(page);
}

// The threads name themselves before they serve the first request.
bool IsAffectedThread() {
  const char wanted = faults->thread.load();
  char name[16] = "";
  return wanted == '\0' || (pthread_getname_np(pthread_self(), name, sizeof name) == 0 && name[0] == wanted);
}

// The countdown is not written after the test may have reset it.
bool CountDown() {
  int left = faults->countdown.load();
  while (left > 0) {
    if (left == 1 && faults->stay.load()) return true;
    if (faults->countdown.compare_exchange_weak(left, left - 1)) return left == 1;
  }
  return false;
}

bool Fails() {
  if (faults == nullptr || faults->countdown.load() <= 0 || !IsAffectedThread() || !CountDown()) return false;
  ++faults->failed;
  errno = ENOMEM;
  return true;
}

}  // namespace

extern "C" {
__attribute__((visibility("default"))) void* malloc(std::size_t size) {
  return Fails() ? nullptr : __libc_malloc(size);
}
__attribute__((visibility("default"))) void* calloc(std::size_t count, std::size_t size) {
  return Fails() ? nullptr : __libc_calloc(count, size);
}
__attribute__((visibility("default"))) void* realloc(void* block, std::size_t size) {
  return Fails() ? nullptr : __libc_realloc(block, size);
}
}
