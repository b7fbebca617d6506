// The shared memory by which a test controls the allocator that it preloads into vornd.
#ifndef VORN_TESTS_SERVER_ALLOCATION_FAULTS_H
#define VORN_TESTS_SERVER_ALLOCATION_FAULTS_H

#include <atomic>

namespace vorn::server {

// The content of a file that both processes map. With a file of zeros every allocation succeeds.
struct AllocationFaults {
  std::atomic<char> thread;    // first character of the name of the threads that it concerns; 0: all threads
  std::atomic<int> countdown;  // the allocation that fails: 1 is the next one; 0 none
  std::atomic<bool> stay;      // all later allocations fail, too, until countdown is set to 0
  std::atomic<int> failed;     // how many have failed
};
static_assert(std::atomic<int>::is_always_lock_free && std::atomic<char>::is_always_lock_free,
              "usable between processes");

}  // namespace vorn::server

#endif  // VORN_TESTS_SERVER_ALLOCATION_FAULTS_H
