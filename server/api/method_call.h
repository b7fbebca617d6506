// One call of a method: the network thread receives its body, a worker runs the method.
#ifndef VORN_SERVER_METHOD_CALL_H
#define VORN_SERVER_METHOD_CALL_H

#include <json/value.h>

#include <atomic>
#include <chrono>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "audit.h"
#include "body.h"
#include "call.h"
#include "caller.h"
#include "http.h"
#include "pending_answer.h"
#include "routes.h"
#include "server_metrics.h"
#include "worker_pool.h"

namespace vorn::server {

// A call whose client has left before a worker was free is not run. A call that is not done at its deadline is
// answered with 504; the method continues, and its end is logged. A call that has not begun by then, or
// when the pool closes, or that is displaced by calls of others, is answered with 503.
class Call : public Exchange, public Job, public std::enable_shared_from_this<Call> {
 public:
  // The objects that all calls share. They must outlive the calls.
  struct Environment {
    WorkerPool& pool;
    const AuditSink& audit;  // receives each call that may change something; a rehearsal has a line in the log instead
    CallMetrics& metrics;
    std::chrono::milliseconds deadline;  // from the end of the body
  };

  // The parts of the head that a call needs. The caller may call this method; the call checks whether it may name the
  // share of the parameters. The route must outlive the call.
  struct Request {
    const Route& route;
    CallerPtr caller;
    std::string origin;                   // the caller's address
    std::optional<std::string> if_match;  // the condition of a changing call, see RunIfUnchanged()
    std::string turn{};                   // Sender::peer of the call
    unsigned recent_requests = 0;         // Sender::recent_requests of the call
    bool rehearses = false;               // whether the changing call is only rehearsed
  };

  Call(Request request, std::unique_ptr<Body> body, Environment environment);

  std::optional<Response> Receive(std::string_view piece) override;
  void Run(Answer answer) override;
  void Abandon() override { abandoned_ = true; }

  void Work() override;
  void Expire(bool running) override;
  void Refuse(Refused why) override;

 private:
  Response Execute();
  bool Give(Response response);
  void Record(const Response& response, std::chrono::nanoseconds duration) const noexcept;

  const Route& route_;
  std::unique_ptr<Body> body_;
  const CallerPtr caller_;
  VORN::CallDescription description_;
  const std::optional<std::string> if_match_;
  const std::string turn_;
  const unsigned recent_requests_;
  const bool rehearses_;
  std::string audited_parameters_;  // of a call that may change something
  const Environment environment_;
  PendingAnswer answer_;
  std::atomic<bool> abandoned_{false};
};

}  // namespace vorn::server

#endif  // VORN_SERVER_METHOD_CALL_H
