// One call of a method: its body comes in on the network thread, the method runs on a worker.
#ifndef VORN_SERVER_CALL_H
#define VORN_SERVER_CALL_H

#include <json/value.h>

#include <memory>
#include <optional>
#include <string_view>

#include "body.h"
#include "http.h"
#include "routes.h"
#include "worker_pool.h"

namespace vorn::server {

class Call : public Exchange, public std::enable_shared_from_this<Call> {
 public:
  // Route and pool must outlive the call.
  Call(const Route& route, std::unique_ptr<Body> body, WorkerPool& pool);

  std::optional<Response> Receive(std::string_view piece) override;
  void Run(Answer answer) override;

 private:
  Response Execute();

  const Route& route_;
  std::unique_ptr<Body> body_;
  WorkerPool& pool_;
};

// Runs the entry function in this thread. Whatever it does, there is an answer: an exception, or no
// answer of its own, is logged and answered with kInternalFailure.
Response RunEntryFunction(const Route& route, Json::Value parameters);

}  // namespace vorn::server

#endif  // VORN_SERVER_CALL_H
