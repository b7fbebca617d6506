// The threads that entry functions run on.
#ifndef VORN_SERVER_WORKER_POOL_H
#define VORN_SERVER_WORKER_POOL_H

#include <condition_variable>
#include <cstddef>
#include <deque>
#include <functional>
#include <mutex>
#include <thread>
#include <unordered_map>
#include <vector>

namespace vorn::server {

// Runs jobs in the order of arrival, except that the jobs of one lane never take more than their
// share of the threads: while four restarts are waited for, everything else goes on.
class WorkerPool {
 public:
  struct Limits {
    std::size_t threads = 16;  // started one by one, when there is work for them
    std::size_t per_lane = 4;
    std::size_t queue = 256;  // jobs that no thread has begun
  };
  using Job = std::function<void()>;

  explicit WorkerPool(Limits limits);
  ~WorkerPool();  // runs what is queued to the end
  WorkerPool(const WorkerPool&) = delete;
  WorkerPool& operator=(const WorkerPool&) = delete;

  // False, and the job will not run, when the queue is full. A lane is known by its address alone.
  bool Submit(const void* lane, Job job);

 private:
  struct Queued {
    const void* lane;
    Job job;
  };

  void StartThread();
  void Work();
  std::deque<Queued>::iterator FirstRunnable();

  const Limits limits_;
  std::mutex mutex_;
  std::condition_variable wake_;
  std::deque<Queued> queue_;
  std::unordered_map<const void*, std::size_t> running_;  // by lane
  std::size_t idle_ = 0;                                  // threads that wait for a job
  bool stopping_ = false;
  std::vector<std::thread> threads_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_WORKER_POOL_H
