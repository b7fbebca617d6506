// The readiness check: an empty call runs through the threads of the methods that only read.
#ifndef VORN_SERVER_PROBE_H
#define VORN_SERVER_PROBE_H

#include <chrono>
#include <memory>
#include <optional>
#include <string_view>

#include "http.h"
#include "pending_answer.h"
#include "worker_pool.h"

namespace vorn::server {

// Answers 200 if a worker takes the job in time, else 503.
class Probe : public Exchange, public Job, public std::enable_shared_from_this<Probe> {
 public:
  // The pool must outlive this.
  Probe(WorkerPool& pool, std::chrono::milliseconds time) : pool_(pool), time_(time) {}

  std::optional<Response> Receive(std::string_view /*piece*/) override { return std::nullopt; }
  void Run(Answer answer) override;

  void Work() override;
  void Expire(bool running) override;
  void Refuse() override;

 private:
  WorkerPool& pool_;
  const std::chrono::milliseconds time_;
  PendingAnswer answer_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_PROBE_H
