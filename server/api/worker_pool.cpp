#include "worker_pool.h"

#include <pthread.h>
#include <syslog.h>

#include <algorithm>
#include <exception>
#include <utility>

namespace vorn::server {

WorkerPool::WorkerPool(Limits limits) : limits_(limits) {
  const std::lock_guard<std::mutex> lock(mutex_);
  threads_.reserve(limits_.threads);
  threads_.emplace_back([this] { Work(); });
  watch_ = std::thread([this] { Watch(); });
}

WorkerPool::~WorkerPool() {
  Close();
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    ending_ = true;
  }
  wake_.notify_all();
  watch_wake_.notify_all();
  for (std::thread& thread : threads_) thread.join();
  watch_.join();
}

bool WorkerPool::Submit(const void* lane, std::shared_ptr<Job> job, std::chrono::milliseconds time) {
  const auto now = Clock::now();
  Entries one;
  one.push_back({nullptr, std::move(job), now + time, {}});
  const std::lock_guard<std::mutex> lock(mutex_);
  Lane& its_lane = lanes_[lane];
  if (closed_ || its_lane.queued >= limits_.lane_queue) return false;
  ++its_lane.queued;
  one.front().lane = &its_lane;
  queue_.splice(queue_.end(), one);
  if (MayTake()) {
    EngageThread();
    WatchNoLaterThan(now + time);
  } else {
    WatchNoLaterThan(now + limits_.long_after);
  }
  return true;
}

void WorkerPool::Close() {
  Entries refused;
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    closed_ = true;
    for (const Entry& entry : queue_) --entry.lane->queued;
    refused.swap(queue_);
  }
  for (const Entry& entry : refused) entry.job->Refuse();
}

// Wakes a thread that waits, or starts one. The vector has room for all threads, so it never reallocates. If no
// thread can be started, the pool goes on with those it has.
void WorkerPool::EngageThread() {
  if (idle_ > 0) return wake_.notify_one();
  if (threads_.size() >= limits_.threads) return;
  try {
    threads_.emplace_back([this] { Work(); });
  } catch (const std::exception& error) {
    syslog(LOG_WARNING, "No further worker thread, going on with %zu: %s", threads_.size(), error.what());
  }
}

WorkerPool::Entries::iterator WorkerPool::FirstRunnable() {
  if (!MayTake()) return queue_.end();
  return std::find_if(queue_.begin(), queue_.end(),
                      [this](const Entry& entry) { return entry.lane->running < limits_.lane_threads; });
}

void WorkerPool::Work() {
  pthread_setname_np(pthread_self(), "worker");
  std::unique_lock<std::mutex> lock(mutex_);
  while (!ending_) {
    const auto entry = FirstRunnable();
    if (entry == queue_.end()) {
      ++idle_;
      wake_.wait(lock);
      --idle_;
      continue;
    }
    Begin(entry);
    RunUnlocked(entry, &lock);
  }
}

// Moves the entry to those that run. The next job may have been submitted to this thread, too: another one takes it.
void WorkerPool::Begin(Entries::iterator entry) {
  entry->begun = Clock::now();
  --entry->lane->queued;
  ++entry->lane->running;
  running_.splice(running_.end(), queue_, entry);
  if (queue_.empty()) return;
  if (FirstRunnable() != queue_.end()) EngageThread();
  WatchNoLaterThan(entry->begun + limits_.long_after);
}

void WorkerPool::RunUnlocked(Entries::iterator entry, std::unique_lock<std::mutex>* lock) {
  Job& job = *entry->job;
  lock->unlock();
  job.Work();
  lock->lock();
  --entry->lane->running;
  if (entry->is_long) --long_jobs_;
  Entries ended;
  ended.splice(ended.end(), running_, entry);
  lock->unlock();
  ended.clear();  // destroys the job outside of the lock
  lock->lock();
}

void WorkerPool::WatchNoLaterThan(Clock::time_point time) {
  if (time >= next_watch_) return;
  next_watch_ = time;
  watch_wake_.notify_one();
}

void WorkerPool::Watch() {
  std::unique_lock<std::mutex> lock(mutex_);
  while (!ending_) {
    // wait_until() converts the time point, and the largest one would overflow.
    const auto time = std::min(next_watch_, Clock::now() + std::chrono::hours(1));
    if (watch_wake_.wait_until(lock, time) != std::cv_status::timeout) continue;
    const auto now = Clock::now();
    MarkLongJobs(now);
    bool running = false;
    while (std::shared_ptr<Job> job = TakeOverdue(now, &running)) {
      lock.unlock();
      job->Expire(running);
      job.reset();
      lock.lock();
    }
    next_watch_ = NextWatch();
  }
}

void WorkerPool::MarkLongJobs(Clock::time_point now) {
  for (Entry& entry : running_) {
    if (entry.is_long || now < entry.begun + limits_.long_after) continue;
    entry.is_long = true;
    ++long_jobs_;
    if (FirstRunnable() != queue_.end()) EngageThread();
  }
}

// Returns one job whose deadline has passed, or nullptr. A job that waits is removed from the queue.
std::shared_ptr<Job> WorkerPool::TakeOverdue(Clock::time_point now, bool* running) {
  const auto overdue = [now](const Entry& entry) { return !entry.expired && now >= entry.deadline; };
  const auto waiting = std::find_if(queue_.begin(), queue_.end(), overdue);
  const auto begun = std::find_if(running_.begin(), running_.end(), overdue);
  *running = waiting == queue_.end();
  if (*running && begun == running_.end()) return nullptr;
  if (*running) {
    begun->expired = true;
    return begun->job;
  }
  std::shared_ptr<Job> job = std::move(waiting->job);
  --waiting->lane->queued;
  queue_.erase(waiting);
  return job;
}

// The next deadline, or the moment when a running job counts as long if another one waits for that.
WorkerPool::Clock::time_point WorkerPool::NextWatch() const {
  auto next = Clock::time_point::max();
  for (const Entry& entry : queue_) next = std::min(next, entry.deadline);
  for (const Entry& entry : running_) {
    if (!entry.expired) next = std::min(next, entry.deadline);
    if (!entry.is_long && !queue_.empty()) next = std::min(next, entry.begun + limits_.long_after);
  }
  return next;
}

}  // namespace vorn::server
