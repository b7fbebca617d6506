#include "method_call.h"

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

Response CallEntryFunction(const Route& route, Json::Value parameters, VORN::CallDescription description) {
  const VORN::CallContext context(std::move(description));
  VORN::APIRequest request(std::move(parameters));
  VORN::APIResponse response;
  route.row.handler(&request, &response);
  if (!response.answered()) return NoAnswer(route, "the method ended without one");
  const Remarks remarks{context.reasons(), context.warnings()};
  if (response.error() == 0) return Success(response.data(), remarks);
  const Descriptor::ErrorCode code = route.descriptor->Describe(response.error());
  return Failure(code.status, response.error(), code.text, response.data(), remarks);
}

}  // namespace

Response RunEntryFunction(const Route& route, Json::Value parameters, VORN::CallDescription description) {
  try {
    return CallEntryFunction(route, std::move(parameters), std::move(description));
  } catch (const std::exception& exception) {
    return NoAnswer(route, exception.what());
  } catch (...) {
    return NoAnswer(route, "an exception of unknown type");
  }
}

Call::Call(const Route& route, std::unique_ptr<Body> body, VORN::CallDescription description, WorkerPool& pool)
    : route_(route), body_(std::move(body)), description_(std::move(description)), pool_(pool) {
  description_.method = route_.Id();
  description_.may_write = !route_.method.reads_only;
}

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
  description_.uploads = body_->Uploads();
  Response response =
      std::holds_alternative<Response>(parameters)
          ? std::get<Response>(std::move(parameters))
          : RunEntryFunction(route_, std::get<Json::Value>(std::move(parameters)), std::move(description_));
  body_.reset();  // before the client can see the answer
  return response;
}

}  // namespace vorn::server
