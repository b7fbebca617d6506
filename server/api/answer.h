// The JSON envelope of every answer:
//     {"success": true, "data": ...}
//     {"success": false, "error": {"code": ..., "text": ..., "details": ..., "reasons": [...]}}
// with "warnings": [...] beside "success". Details, reasons and warnings are left out if there are none. The answer of
// a rehearsal has "rehearsal": {...} besides (rehearsal_answer.h).
#ifndef VORN_SERVER_ANSWER_H
#define VORN_SERVER_ANSWER_H

#include <json/value.h>

#include <string>
#include <string_view>
#include <vector>

#include "http.h"

namespace vorn::server {

// The error code of an answer whose call failed inside the server. It is the modules' code for a failed
// platform operation, too, because a caller can do the same about both.
constexpr int kInternalFailure = 2302;

// The reasons and warnings that the platform added to a call.
struct Remarks {
  std::vector<std::string> reasons;   // why operations of a failed call failed
  std::vector<std::string> warnings;  // what the caller should know besides the result
  std::string rehearsal{};            // JSON text of what a rehearsed call would have done; empty for other calls
};

// Compact JSON text in ASCII.
std::string WriteJson(const Json::Value& value);

// The answer of a method that succeeded. The reasons are ignored. `data` is JSON text.
Response Success(const Json::Value& data, const Remarks& remarks = {});
Response SuccessWith(std::string_view data, const Remarks& remarks);

// The answer of a method that failed. `details` may be null.
Response Failure(int status, int code, std::string_view text, const Json::Value& details = Json::Value(),
                 const Remarks& remarks = {});

// The answer of the server itself to a request that it does not carry out: the error code is the HTTP status.
Response Refusal(int status, std::string_view text);

// A refusal with status 401, which asks for a token or a session (RFC 6750, 3).
Response Unauthenticated(std::string_view text);

// The answer to a call that failed inside the server, with the code kInternalFailure. Without memory it has no body.
Response InternalFailure() noexcept;

// A refusal with status 503 and a Retry-After of one second.
Response Busy(std::string_view text);

}  // namespace vorn::server

#endif  // VORN_SERVER_ANSWER_H
