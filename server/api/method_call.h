// One call of a method: its body comes in on the network thread, the method runs on a worker.
#ifndef VORN_SERVER_METHOD_CALL_H
#define VORN_SERVER_METHOD_CALL_H

#include <json/value.h>

#include <memory>
#include <optional>
#include <string_view>

#include "body.h"
#include "call.h"
#include "http.h"
#include "routes.h"
#include "worker_pool.h"

namespace vorn::server {

class Call : public Exchange, public std::enable_shared_from_this<Call> {
 public:
  // `description` tells who calls; the call adds what it calls and the paths of the uploads. Route and pool must
  // outlive the call.
  Call(const Route& route, std::unique_ptr<Body> body, VORN::CallDescription description, WorkerPool& pool);

  std::optional<Response> Receive(std::string_view piece) override;
  void Run(Answer answer) override;

 private:
  Response Execute();

  const Route& route_;
  std::unique_ptr<Body> body_;
  VORN::CallDescription description_;
  WorkerPool& pool_;
};

// Runs the entry function in this thread, in a call context of this description, and returns its answer. An
// exception and a missing answer are logged and answered with kInternalFailure.
Response RunEntryFunction(const Route& route, Json::Value parameters, VORN::CallDescription description);

}  // namespace vorn::server

#endif  // VORN_SERVER_METHOD_CALL_H
