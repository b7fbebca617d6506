// The envelope around every answer: {"success": true, "data": ...}, or
// {"success": false, "error": {"code": ..., "text": ..., "details": ...}}.
#ifndef VORN_SERVER_ANSWER_H
#define VORN_SERVER_ANSWER_H

#include <json/value.h>

#include <string_view>

#include "http.h"

namespace vorn::server {

// Also the module's own code for "a platform operation failed": what a caller can do is the same.
constexpr int kInternalFailure = 2302;

Response Success(const Json::Value& data);

// A method's failure. Null details are left out.
Response Failure(int status, int code, std::string_view text, const Json::Value& details = Json::Value());

// The server's own: the code is the HTTP status, `text` says what is wrong with the request.
Response Refusal(int status, std::string_view text);

}  // namespace vorn::server

#endif  // VORN_SERVER_ANSWER_H
