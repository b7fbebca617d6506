#include "method_call.h"

#include <syslog.h>

#include <algorithm>
#include <exception>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "answer.h"
#include "entry_function.h"
#include "log_quote.h"
#include "secret.h"

namespace vorn::server {
namespace {

// The largest body of a small call, in bytes. Reading it and answering with its values takes less than a millisecond of
// CPU time, so that even a full lane of small calls delays the next one by less than a quarter of a second.
constexpr std::size_t kSmallBody = 1024;

constexpr const char* kSecretInParameters =
    "A parameter contains a token, a session or a sign-in code, which would be logged. Send a token in the header "
    "Authorization; a list of tokens names each by its id.";
constexpr const char* kTooMany = "Too many calls of this method are waiting. Try again soon.";

JobSize SizeOf(const Body& body) { return body.size() > kSmallBody ? JobSize::kLarge : JobSize::kSmall; }

// If there is no memory for this answer either, the client gets only the status.
Response NoAnswer(const Route& route, const char* reason) noexcept {
  try {
    syslog(LOG_ERR, "%s: no answer: %s", route.Name().c_str(), QuotedForLog(reason).c_str());
  } catch (...) {  // no memory for the log
  }
  return InternalFailure();
}

// Returns the result of `function`, or the answer to a call that ended with an exception.
template <typename Function>
Response AnswerOf(const Route& route, Function function) noexcept {
  try {
    return function();
  } catch (const std::exception& exception) {
    return NoAnswer(route, exception.what());
  } catch (...) {
    return NoAnswer(route, "an exception of unknown type");
  }
}

// Large parameters are copied only if something must be left out.
std::string TextForAudit(const Route& route, const Json::Value& parameters) {
  const std::vector<std::string> unlogged = route.descriptor->Unlogged("/api/" + route.Id(), parameters);
  if (unlogged.empty()) return AuditedParameters(parameters);
  Json::Value logged = parameters;
  for (const std::string& name : unlogged) logged[name] = "(left out)";
  return AuditedParameters(logged);
}

// Whether any text inside of the value contains a token, a session or a code: parameters are logged and kept.
bool HasSecret(const Json::Value& value) {
  const char* begin = nullptr;
  const char* end = nullptr;
  if (value.getString(&begin, &end)) return ContainsSecret({begin, static_cast<std::size_t>(end - begin)});
  return (value.isArray() || value.isObject()) && std::any_of(value.begin(), value.end(), HasSecret);
}

// Compares the whole string: a module may take another spelling for the same folder, which is refused here.
bool MayNameShare(const Caller& caller, const Route& route, const Json::Value& parameters) {
  if (caller.shares.empty()) return true;
  const Json::Value& share = parameters[route.method.share_parameter];
  return share.isString() && Permits(caller.shares, share.asString());
}

}  // namespace

Call::Call(Request request, std::unique_ptr<Body> body, Environment environment)
    : route_(request.route),
      body_(std::move(body)),
      caller_(std::move(request.caller)),
      if_match_(std::move(request.if_match)),
      turn_(std::move(request.turn)),
      recent_requests_(request.recent_requests),
      rehearses_(request.rehearses),
      environment_(environment),
      answer_(caller_->name) {
  description_.caller = caller_->name;
  description_.origin = std::move(request.origin);
  description_.method = route_.Id();
  // A rehearsal writes to a draft, which a reader may do.
  const bool may_change = caller_->role == Role::kAdministrator || rehearses_;
  description_.may_write = may_change && !route_.method.reads_only;
  description_.sees_remarks = caller_->role == Role::kAdministrator;
}

std::optional<Response> Call::Receive(std::string_view piece) { return body_->Receive(piece); }

void Call::Run(Answer answer) {
  answer_.Await(std::move(answer));
  try {
    if (environment_.pool.Enqueue({&route_, SizeOf(*body_)}, shared_from_this(), environment_.deadline,
                                  {turn_, recent_requests_})) {
      return;
    }
    Give(Busy(kTooMany));
  } catch (const std::exception& exception) {
    Give(NoAnswer(route_, exception.what()));
  }
}

// Gives the answer, unless one was given before. Returns whether it was given.
bool Call::Give(Response response) {
  const int code = response.error_code;
  const bool given = answer_.Give(std::move(response));
  if (given) environment_.metrics.CountAnswer(route_, code);
  return given;
}

void Call::Work() {
  const auto begun = std::chrono::steady_clock::now();
  Response response;
  const bool run = !abandoned_;  // otherwise the client has left
  if (run) {
    response = AnswerOf(route_, [this] { return Execute(); });
  } else {
    response.status = 503;
    response.error_code = 503;
  }
  body_.reset();  // the uploads are removed before the client sees the answer
  if (run) Record(response, std::chrono::steady_clock::now() - begun);
  response.begun = begun;
  const int status = response.status;
  if (!Give(std::move(response))) {
    syslog(LOG_NOTICE, "%s: ended with status %d after its deadline", route_.Name().c_str(), status);
  }
}

Response Call::Execute() {
  std::variant<Json::Value, Response> parameters = body_->TakeParameters();
  if (auto* refusal = std::get_if<Response>(&parameters)) return std::move(*refusal);
  Json::Value& object = std::get<Json::Value>(parameters);
  if (!MayNameShare(*caller_, route_, object)) return Refusal(403, "This token is not for this shared folder.");
  if (HasSecret(object)) return Refusal(400, kSecretInParameters);
  description_.uploads = body_->Uploads();
  if (!route_.method.reads_only) {
    audited_parameters_ = TextForAudit(route_, object);
    description_.parameters = audited_parameters_;
  }
  if (rehearses_) {
    const bool sees_all = caller_->shares.empty() && caller_->apis.empty();
    return Rehearse(route_, std::move(object), description_, if_match_, sees_all);
  }
  if (route_.own) return route_.own(object, *caller_);
  if (!if_match_) return RunAndAnswer(route_, std::move(object), description_);
  return RunIfUnchanged(route_, std::move(object), description_, *if_match_);
}

// A change must not be undone by a lack of memory for its record; the access log still has a line for it.
void Call::Record(const Response& response, std::chrono::nanoseconds duration) const noexcept {
  const auto worked = std::chrono::duration_cast<std::chrono::microseconds>(duration);
  environment_.metrics.AddDuration(route_, worked);
  if (route_.method.reads_only) return;
  try {
    const AuditRecord record{description_.caller,
                             description_.origin,
                             description_.method,
                             audited_parameters_,
                             response.status,
                             response.error_code,
                             worked};
    if (!rehearses_) return environment_.audit(record);
    syslog(LOG_INFO, "%s", FormatAudit(record, "rehearsal").c_str());
  } catch (const std::exception&) {
    syslog(LOG_ERR, "A call has no audit record: no memory");
  }
}

void Call::Expire(bool running) {
  if (!running) {
    Give(AnswerOf(route_, [] { return Busy("The call has waited too long for others. Try again soon."); }));
    return;
  }
  syslog(LOG_ERR, "%s: not done at its deadline", route_.Name().c_str());
  Give(AnswerOf(route_, [] {
    return Refusal(504, "The operation takes longer than expected. It goes on; the server's log tells when it ends.");
  }));
}

void Call::Refuse(Refused why) {
  const char* const text = why == Refused::kClosed ? "The server is stopping. Try again soon." : kTooMany;
  Give(AnswerOf(route_, [text] { return Busy(text); }));
}

}  // namespace vorn::server
