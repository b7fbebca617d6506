// A page that a worker thread makes, because making it may wait or shows that workers are free.
#ifndef VORN_SERVER_WORKER_PAGE_H
#define VORN_SERVER_WORKER_PAGE_H

#include <chrono>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "http.h"
#include "pending_answer.h"
#include "worker_pool.h"

namespace vorn::server {

// Answers with what `make` returns if a worker has done it in time, else with 503. The requests for one page are a lane
// of the pool, in which the peers have turns.
class WorkerPage : public Exchange, public Job, public std::enable_shared_from_this<WorkerPage> {
 public:
  // The part of a request that its turn depends on.
  struct Request {
    const void* page;              // identifies the page
    std::string turn{};            // Sender::peer
    unsigned recent_requests = 0;  // Sender::recent_requests
  };

  // The pool must outlive this. `make` may throw std::bad_alloc.
  WorkerPage(WorkerPool& pool, Request request, std::chrono::milliseconds time, std::function<Response()> make)
      : pool_(pool), request_(std::move(request)), time_(time), make_(std::move(make)) {}

  std::optional<Response> Receive(std::string_view /*piece*/) override { return std::nullopt; }
  void Run(Answer answer) override;

  void Work() override;
  void Expire(bool running) override;
  void Refuse(Refused why) override;

 private:
  WorkerPool& pool_;
  const Request request_;
  const std::chrono::milliseconds time_;
  const std::function<Response()> make_;
  PendingAnswer answer_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_WORKER_PAGE_H
