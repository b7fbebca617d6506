// The worker threads that run entry functions.
#ifndef VORN_SERVER_WORKER_POOL_H
#define VORN_SERVER_WORKER_POOL_H

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <list>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>

namespace vorn::server {

// Why a job is not run.
enum class Refused {
  kClosed,     // the pool was closed before the job began
  kDisplaced,  // the queue, or the server, is full, and the job's sender has a larger part of it than others
};

// A unit of work. Exactly one of Work() and Refuse() is called, or Expire(false). None of them may throw.
class Job {
 public:
  virtual ~Job() = default;

  // Does the work, on a worker thread.
  virtual void Work() = 0;

  // The deadline has passed. Called at most once, on a thread of the pool. If `running`, then Work() has begun and
  // may end at any moment; otherwise it is never called.
  virtual void Expire(bool running) = 0;

  // The job will not be run.
  virtual void Refuse(Refused why) = 0;
};

// The sender of a job, as far as its turn depends on it.
struct Sender {
  std::string_view peer;         // senders with the same string share one place in the order of turns
  unsigned recent_requests = 0;  // of the connection that sends the job, see Head
};

// The expected amount of work of a job, as far as it is known before the job begins.
enum class JobSize { kSmall, kLarge };

// The jobs of one owner (a method) and one size. The owner is identified by its address only.
using LaneId = std::pair<const void*, JobSize>;

// Serves the lanes in round-robin order, within a lane the peers in round-robin order, and the jobs of a peer in FIFO
// order, so that waiting jobs of one lane do not delay other lanes, nor those of one peer the other peers:
//   - A lane has a share of the threads and of the queue.
//   - When a lane's share of the queue is full, a further job displaces one of the peer that has most jobs there. Of
//     the jobs of that peer, the pool removes the one whose connection has sent most requests recently, and of several
//     such jobs the last one. This may be the further job itself.
//   - Only a few threads work at the same time as long as jobs are short, because more of them would only compete
//     for the same locks and caches. A job that has run for `long_after` counts as long, and a further thread
//     takes the next job. A large job counts as long from its beginning.
// All functions are thread-safe.
class WorkerPool {
 public:
  using Clock = std::chrono::steady_clock;

  struct Limits {
    std::size_t short_threads = 2;  // threads that run short jobs at the same time
    std::size_t threads = 64;       // all threads; each is started when it is needed for the first time
    std::size_t lane_threads = 4;   // small jobs of one lane that run at the same time
    std::size_t large_threads = 1;  // large jobs of one lane that run at the same time
    std::size_t lane_queue = 256;   // jobs of one lane that wait
    std::chrono::milliseconds long_after{5};
  };

  explicit WorkerPool(Limits limits);

  // Closes the pool and waits until all running jobs have ended.
  ~WorkerPool();
  WorkerPool(const WorkerPool&) = delete;
  WorkerPool& operator=(const WorkerPool&) = delete;

  // Submits a job that must be done `time` from now. Returns false, without calling any of the job's functions, if
  // the lane's share of the queue is full and this job would be displaced, or if the pool is closed. Throws
  // std::bad_alloc and has then no effect. Refuses the job that is displaced, on the calling thread.
  bool Submit(LaneId lane, std::shared_ptr<Job> job, std::chrono::milliseconds time, const Sender& sender = {});

  // Does what Submit() does, but wakes no thread: the job waits for Wake() or for a thread that has just ended another
  // job. For a caller that has several jobs to submit.
  bool Enqueue(LaneId lane, std::shared_ptr<Job> job, std::chrono::milliseconds time, const Sender& sender = {});
  void Wake();

  // Displaces a job of the lane in which most jobs wait, as a further job in its full queue would. Returns false if no
  // job waits.
  bool Displace();

  struct Load {
    std::size_t waiting = 0;
    std::size_t running = 0;
  };
  Load load() const;

  // Refuses the jobs that wait and all further ones. Running jobs continue. Does not wait.
  void Close();

 private:
  struct Lane;
  struct Entry {
    Lane* lane;
    std::shared_ptr<Job> job;
    unsigned recent_requests;
    Clock::time_point deadline;
    Clock::time_point begun;
    bool is_long = false;
    bool expired = false;
  };
  using Entries = std::list<Entry>;
  struct PeerQueue {
    std::string peer;
    Entries jobs;  // never empty
  };
  using PeerQueues = std::list<PeerQueue>;
  struct Lane {
    JobSize size = JobSize::kSmall;
    PeerQueues peers;         // those with waiting jobs; the first one has the next turn
    std::size_t waiting = 0;  // jobs of all peers
    std::size_t running = 0;
    std::uint64_t turn = 0;  // when a job of the lane was last begun; see turn_
  };

  void Work();
  void Watch();
  std::size_t MostRunning() const { return limits_.short_threads + long_jobs_; }
  bool MayTakeFrom(const Lane& lane) const;
  Lane* NextLane();
  void StartThread();
  bool EngageThread();
  void RunJobs(std::unique_lock<std::mutex>* lock, Entries* ended);
  static void Append(Lane* lane, std::string_view peer, Entries* job);
  static Entries TakeSurplus(Lane* lane);
  static Entries TakeFrom(Lane* lane, PeerQueues::iterator peer, Entries::iterator entry);
  Entries::iterator Begin(Lane* lane);
  void End(Entries::iterator entry, Entries* ended);
  void WatchNoLaterThan(Clock::time_point time);
  void MarkLongJobs(Clock::time_point now);
  void ExpireUnlocked(Clock::time_point now, std::unique_lock<std::mutex>* lock);
  std::shared_ptr<Job> TakeOverdue(Clock::time_point now);
  std::shared_ptr<Job> MarkOverdue(Clock::time_point now);
  Clock::time_point NextWatch() const;

  const Limits limits_;
  mutable std::mutex mutex_;
  std::condition_variable wake_;        // workers wait for a job
  std::condition_variable watch_wake_;  // the watch thread waits for the next deadline or stall
  std::map<LaneId, Lane> lanes_;        // all that have ever had a job
  std::size_t queued_ = 0;              // in all lanes
  std::uint64_t turn_ = 0;              // counts the jobs that were begun
  Entries running_;
  std::size_t long_jobs_ = 0;  // of running_
  std::size_t idle_ = 0;       // threads that do not look for a job
  std::size_t waking_ = 0;     // how many of the idle threads are to wake
  bool closed_ = false;
  bool ending_ = false;
  Clock::time_point next_watch_ = Clock::time_point::max();
  std::vector<std::thread> threads_;
  std::thread watch_;
};

// The methods that only read have threads of their own, which those that change something cannot take from them.
struct Workers {
  explicit Workers(WorkerPool::Limits limits = {}) : changing(limits), reading(limits) {}

  void Wake() {
    reading.Wake();
    changing.Wake();
  }

  // Displaces a job of the pool in which more jobs wait. Returns false if no job waits.
  bool Displace() {
    return reading.load().waiting > changing.load().waiting ? reading.Displace() : changing.Displace();
  }

  void Close() {
    reading.Close();
    changing.Close();
  }

  WorkerPool changing;
  WorkerPool reading;  // destroyed first: a call that reads may ask for the load of both
};

}  // namespace vorn::server

#endif  // VORN_SERVER_WORKER_POOL_H
