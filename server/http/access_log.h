// One line for each request that was answered.
#ifndef VORN_SERVER_ACCESS_LOG_H
#define VORN_SERVER_ACCESS_LOG_H

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "message.h"

namespace vorn::server {

struct AccessRecord {
  std::string caller;  // the authenticated account or token; empty if it is unknown
  Peer peer;
  std::string method;
  std::string target;  // without the query
  int status = 0;
  std::uint64_t bytes = 0;  // of the body, as far as it was sent
  std::chrono::microseconds queued{0};
  std::chrono::microseconds worked{0};
};

// Writes records from a thread of its own, so that a slow journal delays no client. The thread collects the records of
// a tenth of a second, because waking it for each of them would cost as much as writing it. A record that finds the
// queue full, and a record of status 503, is counted instead; the counts are written every ten seconds.
class AccessLog {
 public:
  struct Counts {
    std::uint64_t busy = 0;     // answers 503
    std::uint64_t dropped = 0;  // records without a line
  };
  // All functions are called on the log's own thread.
  struct Sink {
    std::function<void(const AccessRecord&)> write;
    std::function<void()> flush;  // the end of a batch of records; must not throw
    std::function<void(const Counts&)> summarize;
  };

  explicit AccessLog(Sink sink, std::size_t queue = 4096);
  ~AccessLog();  // writes everything that was added
  AccessLog(const AccessLog&) = delete;
  AccessLog& operator=(const AccessLog&) = delete;

  // Thread-safe; does not wait and does not throw.
  void Add(AccessRecord record) noexcept;

  // The number of answers by HTTP status since the start.
  std::map<int, std::uint64_t> Statuses() const;

  // Counts a record that could not be made.
  void Drop() noexcept;

 private:
  void Work();
  void Write(const std::vector<AccessRecord>& records) noexcept;
  void WriteCounts(std::unique_lock<std::mutex>* lock);

  const Sink sink_;
  const std::size_t limit_;
  mutable std::mutex mutex_;
  std::condition_variable wake_;  // the first record, a queue that is half full, or the end
  std::vector<AccessRecord> queue_;
  Counts counts_;
  std::map<int, std::uint64_t> statuses_;
  bool stopping_ = false;
  std::thread thread_;
};

// A record as one line: control characters of the client's text are escaped.
std::string FormatRecord(const AccessRecord& record);

// Writes to the systemd journal, in fields of their own (VORN_PEER, VORN_STATUS, ...; systemd.journal-fields(7)).
AccessLog::Sink JournalSink();

// Writes lines to `descriptor`, which must outlive the log, with one write(2) for a batch. What cannot be written is
// lost. The counts go to syslog(3).
AccessLog::Sink LineSink(int descriptor);

}  // namespace vorn::server

#endif  // VORN_SERVER_ACCESS_LOG_H
