// How the process uses the allocator of the C library.
#ifndef VORN_SERVER_MEMORY_H
#define VORN_SERVER_MEMORY_H

namespace vorn::server {

// Configures the allocator to return freed memory to the system: few arenas, and large blocks outside of them
// (mallopt(3)).
// Called once, before any thread is started.
void ConfigureAllocator();

// Returns the free pages of all arenas to the system (malloc_trim(3)). Takes some milliseconds, so it is called only
// after a call that has used much memory.
void ReturnFreeMemory();

}  // namespace vorn::server

#endif  // VORN_SERVER_MEMORY_H
