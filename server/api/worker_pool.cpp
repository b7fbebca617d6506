#include "worker_pool.h"

#include <syslog.h>

#include <algorithm>
#include <system_error>
#include <utility>

namespace vorn::server {

WorkerPool::WorkerPool(Limits limits) : limits_(limits) {
  const std::lock_guard<std::mutex> lock(mutex_);
  threads_.emplace_back([this] { Work(); });
}

WorkerPool::~WorkerPool() {
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    stopping_ = true;
  }
  wake_.notify_all();
  for (std::thread& thread : threads_) thread.join();
}

bool WorkerPool::Submit(const void* lane, Job job) {
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    if (queue_.size() >= limits_.queue) return false;
    queue_.push_back({lane, std::move(job)});
    if (queue_.size() > idle_ && threads_.size() < limits_.threads) StartThread();
  }
  wake_.notify_one();
  return true;
}

void WorkerPool::StartThread() {
  try {
    threads_.emplace_back([this] { Work(); });
  } catch (const std::system_error& error) {
    syslog(LOG_WARNING, "No further thread, going on with %zu: %s", threads_.size(), error.what());
  }
}

std::deque<WorkerPool::Queued>::iterator WorkerPool::FirstRunnable() {
  return std::find_if(queue_.begin(), queue_.end(),
                      [this](const Queued& queued) { return running_[queued.lane] < limits_.per_lane; });
}

void WorkerPool::Work() {
  std::unique_lock<std::mutex> lock(mutex_);
  for (;;) {
    const auto next = FirstRunnable();
    if (next == queue_.end()) {
      if (stopping_) return;  // what is left in a lane is for the threads that are busy in it
      ++idle_;
      wake_.wait(lock);
      --idle_;
      continue;
    }
    Queued queued = std::move(*next);
    queue_.erase(next);
    ++running_[queued.lane];
    lock.unlock();
    queued.job();
    queued.job = nullptr;  // what it owns is released outside the lock
    lock.lock();
    --running_[queued.lane];
  }
}

}  // namespace vorn::server
