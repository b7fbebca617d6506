#include "worker_pool.h"

#include <pthread.h>
#include <sched.h>
#include <syslog.h>

#include <algorithm>
#include <exception>
#include <optional>
#include <utility>

namespace vorn::server {
namespace {

// The kernel does not let the calling thread interrupt the thread that wakes it (SCHED_BATCH, sched(7)). Otherwise each
// call would interrupt the network thread before it has read the other requests that have arrived. A scheduling
// policy that the administrator chose is kept.
void YieldToWaker() {
  const sched_param no_priority{};
  if (sched_getscheduler(0) == SCHED_OTHER) sched_setscheduler(0, SCHED_BATCH, &no_priority);
}

}  // namespace

WorkerPool::WorkerPool(Limits limits) : limits_(limits) {
  const std::lock_guard<std::mutex> lock(mutex_);
  threads_.reserve(limits_.threads);
  StartThread();
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

bool WorkerPool::Submit(LaneId lane, std::shared_ptr<Job> job, std::chrono::milliseconds time, const Sender& sender) {
  if (!Enqueue(lane, std::move(job), time, sender)) return false;
  Wake();
  return true;
}

bool WorkerPool::Enqueue(LaneId lane, std::shared_ptr<Job> job, std::chrono::milliseconds time, const Sender& sender) {
  const auto now = Clock::now();
  const Job* const submitted = job.get();
  Entries one;
  one.push_back({nullptr, std::move(job), sender.recent_requests, now + time, {}});
  Entries surplus;
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    if (closed_) return false;
    Lane& its_lane = lanes_[lane];
    its_lane.size = lane.second;
    one.front().lane = &its_lane;
    Append(&its_lane, sender.peer, &one);
    ++queued_;
    if (its_lane.waiting > limits_.lane_queue) {
      surplus = TakeSurplus(&its_lane);
      --queued_;
    }
    WatchNoLaterThan(running_.size() < MostRunning() ? now + time : now + limits_.long_after);
  }
  if (surplus.empty()) return true;
  if (surplus.front().job.get() == submitted) return false;
  surplus.front().job->Refuse(Refused::kDisplaced);
  return true;
}

bool WorkerPool::Displace() {
  Entries displaced;
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    const auto fullest = std::max_element(lanes_.begin(), lanes_.end(), [](const auto& left, const auto& right) {
      return left.second.waiting < right.second.waiting;
    });
    if (fullest == lanes_.end() || fullest->second.waiting == 0) return false;
    displaced = TakeSurplus(&fullest->second);
    --queued_;
  }
  displaced.front().job->Refuse(Refused::kDisplaced);
  return true;
}

// Moves the only job of `job` to the end of the peer's queue.
void WorkerPool::Append(Lane* lane, std::string_view peer, Entries* job) {
  auto queue =
      std::find_if(lane->peers.begin(), lane->peers.end(), [peer](const PeerQueue& each) { return each.peer == peer; });
  if (queue == lane->peers.end()) queue = lane->peers.insert(queue, PeerQueue{std::string(peer), {}});
  queue->jobs.splice(queue->jobs.end(), *job);
  ++lane->waiting;
}

// Removes the job that has the weakest claim to its place in the lane's queue, and returns it.
WorkerPool::Entries WorkerPool::TakeSurplus(Lane* lane) {
  std::size_t most = 0;
  for (const PeerQueue& queue : lane->peers) most = std::max(most, queue.jobs.size());
  PeerQueues::iterator peer;
  std::optional<Entries::iterator> chosen;
  for (auto queue = lane->peers.begin(); queue != lane->peers.end(); ++queue) {
    if (queue->jobs.size() < most) continue;
    for (auto entry = queue->jobs.begin(); entry != queue->jobs.end(); ++entry) {
      if (chosen && entry->recent_requests < (*chosen)->recent_requests) continue;
      chosen = entry;
      peer = queue;
    }
  }
  return TakeFrom(lane, peer, *chosen);
}

// Removes a job from the queue of its peer, and the queue if it was the last one.
WorkerPool::Entries WorkerPool::TakeFrom(Lane* lane, PeerQueues::iterator peer, Entries::iterator entry) {
  Entries taken;
  taken.splice(taken.end(), peer->jobs, entry);
  --lane->waiting;
  if (peer->jobs.empty()) lane->peers.erase(peer);
  return taken;
}

// The thread is notified after the lock is released; otherwise it would wake only to wait for the lock.
void WorkerPool::Wake() {
  bool engaged = false;
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    engaged = EngageThread();
  }
  if (engaged) wake_.notify_one();
}

WorkerPool::Load WorkerPool::load() const {
  const std::lock_guard<std::mutex> lock(mutex_);
  return {queued_, running_.size()};
}

void WorkerPool::Close() {
  Entries refused;
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    closed_ = true;
    for (auto& [id, lane] : lanes_) {
      for (PeerQueue& queue : lane.peers) refused.splice(refused.end(), queue.jobs);
      lane.peers.clear();
      lane.waiting = 0;
    }
    queued_ = 0;
  }
  for (const Entry& entry : refused) entry.job->Refuse(Refused::kClosed);
}

// A thread begins as a sleeping one that is to wake.
void WorkerPool::StartThread() {
  threads_.emplace_back([this] { Work(); });
  ++idle_;
  ++waking_;
}

// If a job may begin, starts a thread for it, or has a sleeping one wake and returns true: the caller then notifies
// wake_. The vector has room for all threads, so it never reallocates. If no thread can be started, the pool continues
// with the existing ones.
bool WorkerPool::EngageThread() {
  if (running_.size() + waking_ >= MostRunning() || NextLane() == nullptr) return false;
  if (idle_ > waking_) {
    ++waking_;
    return true;
  }
  if (threads_.size() >= limits_.threads) return false;
  try {
    StartThread();
  } catch (const std::exception& error) {
    syslog(LOG_WARNING, "No further worker thread, going on with %zu: %s", threads_.size(), error.what());
  }
  return false;
}

bool WorkerPool::MayTakeFrom(const Lane& lane) const {
  const std::size_t share = lane.size == JobSize::kLarge ? limits_.large_threads : limits_.lane_threads;
  return lane.waiting > 0 && lane.running < share;
}

// Returns the least recently served lane whose next job may begin; nullptr if there is none.
WorkerPool::Lane* WorkerPool::NextLane() {
  if (queued_ == 0 || running_.size() >= MostRunning()) return nullptr;
  Lane* next = nullptr;
  for (auto& [id, lane] : lanes_) {
    if (MayTakeFrom(lane) && (next == nullptr || lane.turn < next->turn)) next = &lane;
  }
  return next;
}

void WorkerPool::Work() {
  pthread_setname_np(pthread_self(), "worker");
  YieldToWaker();
  Entries ended;
  std::unique_lock<std::mutex> lock(mutex_);
  for (;;) {
    wake_.wait(lock, [this] { return waking_ > 0 || ending_; });
    if (ending_) return;
    --waking_;
    --idle_;
    RunJobs(&lock, &ended);
    ++idle_;
    lock.unlock();
    ended.clear();
    lock.lock();
  }
}

// Runs jobs until there is none that may begin. Jobs are destroyed outside of the lock; to lock less often, each one
// when the lock is released for the next one, and the last one by the caller.
void WorkerPool::RunJobs(std::unique_lock<std::mutex>* lock, Entries* ended) {
  while (Lane* const lane = NextLane()) {
    const auto entry = Begin(lane);
    const bool engaged = EngageThread();
    lock->unlock();
    if (engaged) wake_.notify_one();
    ended->clear();
    entry->job->Work();
    lock->lock();
    End(entry, ended);
  }
}

// Moves the first job of the peer that has the turn to the running jobs. The peer's next turn is after all others.
WorkerPool::Entries::iterator WorkerPool::Begin(Lane* lane) {
  const auto peer = lane->peers.begin();
  const auto entry = peer->jobs.begin();
  lane->peers.splice(lane->peers.end(), lane->peers, peer);
  Entries taken = TakeFrom(lane, peer, entry);
  running_.splice(running_.end(), taken);
  entry->begun = Clock::now();
  entry->is_long = lane->size == JobSize::kLarge;
  if (entry->is_long) ++long_jobs_;
  ++lane->running;
  lane->turn = ++turn_;
  if (--queued_ > 0) WatchNoLaterThan(entry->begun + limits_.long_after);
  return entry;
}

void WorkerPool::End(Entries::iterator entry, Entries* ended) {
  --entry->lane->running;
  if (entry->is_long) --long_jobs_;
  ended->splice(ended->end(), running_, entry);
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
    ExpireUnlocked(now, &lock);
    next_watch_ = NextWatch();
  }
}

void WorkerPool::ExpireUnlocked(Clock::time_point now, std::unique_lock<std::mutex>* lock) {
  for (;;) {
    std::shared_ptr<Job> job = TakeOverdue(now);
    const bool running = job == nullptr;
    if (running) job = MarkOverdue(now);
    if (job == nullptr) return;
    lock->unlock();
    job->Expire(running);
    job.reset();
    lock->lock();
  }
}

void WorkerPool::MarkLongJobs(Clock::time_point now) {
  for (Entry& entry : running_) {
    if (entry.is_long || now < entry.begun + limits_.long_after) continue;
    entry.is_long = true;
    ++long_jobs_;
    if (EngageThread()) wake_.notify_one();
  }
}

// Removes one job whose deadline has passed from its queue and returns it; nullptr if there is none.
std::shared_ptr<Job> WorkerPool::TakeOverdue(Clock::time_point now) {
  const auto overdue = [now](const Entry& waiting) { return now >= waiting.deadline; };
  for (auto& [id, lane] : lanes_) {
    for (auto peer = lane.peers.begin(); peer != lane.peers.end(); ++peer) {
      const auto entry = std::find_if(peer->jobs.begin(), peer->jobs.end(), overdue);
      if (entry == peer->jobs.end()) continue;
      --queued_;
      return TakeFrom(&lane, peer, entry).front().job;
    }
  }
  return nullptr;
}

// Returns one running job whose deadline has passed, each of them once; nullptr if there is none.
std::shared_ptr<Job> WorkerPool::MarkOverdue(Clock::time_point now) {
  for (Entry& entry : running_) {
    if (entry.expired || now < entry.deadline) continue;
    entry.expired = true;
    return entry.job;
  }
  return nullptr;
}

// The next deadline, or the moment when a running job counts as long if another one waits for that.
WorkerPool::Clock::time_point WorkerPool::NextWatch() const {
  auto next = Clock::time_point::max();
  for (const auto& [id, lane] : lanes_) {
    for (const PeerQueue& queue : lane.peers) {
      for (const Entry& entry : queue.jobs) next = std::min(next, entry.deadline);
    }
  }
  for (const Entry& entry : running_) {
    if (!entry.expired) next = std::min(next, entry.deadline);
    if (!entry.is_long && queued_ > 0) next = std::min(next, entry.begun + limits_.long_after);
  }
  return next;
}

}  // namespace vorn::server
