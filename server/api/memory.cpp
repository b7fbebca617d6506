#include "memory.h"

#include <malloc.h>

namespace vorn::server {
namespace {

// With one arena per thread, a hundred threads would each retain their peak memory.
constexpr int kArenas = 2;
constexpr int kLargeBlock = 128 * 1024;  // also turns off the growth of this limit with each freed block

}  // namespace

void ConfigureAllocator() {
  mallopt(M_ARENA_MAX, kArenas);
  mallopt(M_MMAP_THRESHOLD, kLargeBlock);
  mallopt(M_TRIM_THRESHOLD, kLargeBlock);
}

void ReturnFreeMemory() { malloc_trim(0); }

}  // namespace vorn::server
