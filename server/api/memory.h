// How the process uses the allocator of the C library.
#ifndef VORN_SERVER_MEMORY_H
#define VORN_SERVER_MEMORY_H

namespace vorn::server {

// Makes memory that is freed go back to the system: few arenas, and large blocks outside of them (mallopt(3)).
// Called once, before any thread is started.
void ConfigureAllocator();

// Gives the free pages of all arenas back to the system (malloc_trim(3)). Takes some milliseconds, so it is worth
// its time only after a call that has used much memory.
void ReturnFreeMemory();

}  // namespace vorn::server

#endif  // VORN_SERVER_MEMORY_H
