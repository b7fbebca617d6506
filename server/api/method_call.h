// One call of a method: the network thread receives its body, a worker runs the method.
#ifndef VORN_SERVER_METHOD_CALL_H
#define VORN_SERVER_METHOD_CALL_H

#include <json/value.h>

#include <atomic>
#include <chrono>
#include <memory>
#include <optional>
#include <string_view>

#include "body.h"
#include "call.h"
#include "http.h"
#include "pending_answer.h"
#include "routes.h"
#include "worker_pool.h"

namespace vorn::server {

// A call whose client has left before a worker was free is not run. A call that is not done at its deadline is
// answered with 504; the method continues, and its end is logged. A call that has not begun by then, or
// when the pool closes, is answered with 503.
class Call : public Exchange, public Job, public std::enable_shared_from_this<Call> {
 public:
  // The objects that all calls share. Both must outlive the calls.
  struct Environment {
    WorkerPool& pool;
    std::chrono::milliseconds deadline;  // from the end of the body
  };

  // `description` tells who calls; the call adds the method and the paths of the uploads. The route must outlive
  // the call.
  Call(const Route& route, std::unique_ptr<Body> body, VORN::CallDescription description, Environment environment);

  std::optional<Response> Receive(std::string_view piece) override;
  void Run(Answer answer) override;
  void Abandon() override { abandoned_ = true; }

  void Work() override;
  void Expire(bool running) override;
  void Refuse() override;

 private:
  Response Execute();

  const Route& route_;
  std::unique_ptr<Body> body_;
  VORN::CallDescription description_;
  const Environment environment_;
  PendingAnswer answer_;
  std::atomic<bool> abandoned_{false};
};

// Runs the entry function in this thread, in a call context of this description, and returns its answer. Does not
// throw: an exception (std::bad_alloc included) and a missing answer are logged and answered with kInternalFailure.
Response RunEntryFunction(const Route& route, Json::Value parameters, VORN::CallDescription description);

}  // namespace vorn::server

#endif  // VORN_SERVER_METHOD_CALL_H
