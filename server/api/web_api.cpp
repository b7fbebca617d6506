#include "web_api.h"

#include <string>
#include <utility>

#include "answer.h"
#include "body.h"
#include "browser_guard.h"
#include "form_body.h"
#include "header_value.h"
#include "method_call.h"
#include "multipart.h"

namespace vorn::server {
namespace {

using NewBody = std::variant<std::unique_ptr<Body>, Response>;

std::optional<Response> KeepStrangersOut(const Head& head) {
  if (head.over_tcp && !IsLoopbackHost(head.host.value_or(""))) {
    return Refusal(421, "This server is localhost, 127.0.0.1 and [::1]; the Host header names another one.");
  }
  if (head.origin && !IsLoopbackOrigin(*head.origin)) {
    return Refusal(403, "Web pages of other sites may not use this server.");
  }
  return std::nullopt;
}

Response MethodNotAllowed(std::string_view path, const std::string& allowed) {
  Response response = Refusal(405, "At \"" + std::string(path) + "\" only " + allowed + " is possible.");
  response.headers.emplace_back("Allow", allowed);
  return response;
}

NewBody OpenJson(const Head& head) {
  if (head.content_length > JsonBody::kMaxBytes) return JsonBody::TooLarge();
  return std::make_unique<JsonBody>();
}

NewBody OpenForm(const Head& head, const HeaderValue& type, const UploadFolder& uploads) {
  const auto boundary = type.parameters.find("boundary");
  if (boundary == type.parameters.end() || !MultipartParser::IsBoundary(boundary->second)) {
    return Refusal(400, "The Content-Type of the form names no proper boundary.");
  }
  if (head.content_length > FormBody::kMaxBytes) return FormBody::TooLarge();
  return std::make_unique<FormBody>(boundary->second, uploads);
}

NewBody OpenBody(const Head& head, const UploadFolder& uploads) {
  if (!head.has_body) return std::make_unique<JsonBody>();
  const std::optional<HeaderValue> type = ParseHeaderValue(head.content_type);
  if (type && type->value == "application/json") return OpenJson(head);
  if (type && type->value == "multipart/form-data") return OpenForm(head, *type, uploads);
  return Refusal(415, "Parameters are sent as application/json, files as multipart/form-data; not as \"" +
                          std::string(head.content_type) + "\".");
}

}  // namespace

WebApi::WebApi(const Routes& routes, const UploadFolder& uploads, WorkerPool& pool)
    : routes_(routes), uploads_(uploads), pool_(pool) {}

std::variant<std::shared_ptr<Exchange>, Response> WebApi::Begin(const Head& head) {
  if (auto refusal = KeepStrangersOut(head)) return *std::move(refusal);
  if (auto page = AnswerPage(head)) return *std::move(page);
  std::string unknown;
  const Route* route = routes_.Find(head.target, &unknown);
  if (route == nullptr) return Refusal(404, unknown);
  if (head.method != "POST") return MethodNotAllowed(head.target, "POST");
  NewBody body = OpenBody(head, uploads_);
  if (auto* refusal = std::get_if<Response>(&body)) return std::move(*refusal);
  VORN::CallDescription description;
  if (!head.over_tcp) description.origin = "unix";
  return std::make_shared<Call>(*route, std::get<std::unique_ptr<Body>>(std::move(body)), std::move(description),
                                pool_);
}

Response WebApi::Refuse(int status, std::string_view text) const { return Refusal(status, text); }

std::optional<Response> WebApi::AnswerPage(const Head& head) const {
  if (head.target != "/api" && head.target != "/healthz") return std::nullopt;
  if (head.method != "GET" && head.method != "HEAD") return MethodNotAllowed(head.target, "GET, HEAD");
  return Success(head.target == "/api" ? routes_.List() : Json::Value());
}

}  // namespace vorn::server
