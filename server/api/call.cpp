#include "call.h"

#include <syslog.h>

#include <exception>
#include <string>
#include <utility>
#include <variant>

#include "answer.h"

namespace vorn::server {
namespace {

Response NoAnswer(const Route& route, const char* reason) {
  syslog(LOG_ERR, "%s: no answer: %s", route.Name().c_str(), reason);
  return Failure(500, kInternalFailure, "The operation failed inside the server; its log says more.");
}

Response CallEntryFunction(const Route& route, Json::Value parameters) {
  VORN::APIRequest request(std::move(parameters));
  VORN::APIResponse response;
  route.row.handler(&request, &response);
  if (!response.answered()) return NoAnswer(route, "the method ended without one");
  if (response.error() == 0) return Success(response.data());
  const Descriptor::ErrorCode code = route.descriptor->Describe(response.error());
  return Failure(code.status, response.error(), code.text, response.data());
}

}  // namespace

Response RunEntryFunction(const Route& route, Json::Value parameters) {
  try {
    return CallEntryFunction(route, std::move(parameters));
  } catch (const std::exception& exception) {
    return NoAnswer(route, exception.what());
  } catch (...) {
    return NoAnswer(route, "an exception of unknown type");
  }
}

Call::Call(const Route& route, std::unique_ptr<Body> body, WorkerPool& pool)
    : route_(route), body_(std::move(body)), pool_(pool) {}

std::optional<Response> Call::Receive(std::string_view piece) { return body_->Receive(piece); }

void Call::Run(Answer answer) {
  const bool queued = pool_.Submit(&route_, [self = shared_from_this(), answer] { answer(self->Execute()); });
  if (queued) return;
  syslog(LOG_WARNING, "%s: refused, too many requests are waiting", route_.Name().c_str());
  Response busy = Refusal(503, "Too many requests are waiting. Try again soon.");
  busy.headers.emplace_back("Retry-After", "1");
  answer(std::move(busy));
}

Response Call::Execute() {
  std::variant<Json::Value, Response> parameters = body_->TakeParameters();
  Response response = std::holds_alternative<Response>(parameters)
                          ? std::get<Response>(std::move(parameters))
                          : RunEntryFunction(route_, std::get<Json::Value>(std::move(parameters)));
  body_.reset();  // before the client can see the answer
  return response;
}

}  // namespace vorn::server
