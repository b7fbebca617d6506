#include "answer.h"

#include <json/writer.h>

#include <memory>
#include <sstream>
#include <string>
#include <utility>

#include "reusable.h"

namespace vorn::server {
namespace {

std::unique_ptr<Json::StreamWriter> NewWriter() {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  // Everything but ASCII is escaped, so that a string that is not UTF-8 still makes valid JSON.
  builder["emitUTF8"] = false;
  return std::unique_ptr<Json::StreamWriter>(builder.newStreamWriter());
}

// `,"name":["...", ...]`, or an empty string if there are no sentences.
std::string Member(std::string_view name, const std::vector<std::string>& sentences) {
  if (sentences.empty()) return "";
  Json::Value list(Json::arrayValue);
  for (const std::string& sentence : sentences) list.append(sentence);
  return ",\"" + std::string(name) + "\":" + WriteJson(list);
}

// The members beside "success".
std::string Besides(const Remarks& remarks) {
  const std::string warnings = Member("warnings", remarks.warnings);
  return remarks.rehearsal.empty() ? warnings : warnings + ",\"rehearsal\":" + remarks.rehearsal;
}

}  // namespace

std::string WriteJson(const Json::Value& value) {
  // Constructing a writer costs more than most answers.
  static Reusable<Json::StreamWriter> writers(NewWriter);
  return writers.With([&value](Json::StreamWriter& writer) {
    std::ostringstream text;
    writer.write(value, &text);
    return text.str();
  });
}

Response Success(const Json::Value& data, const Remarks& remarks) { return SuccessWith(WriteJson(data), remarks); }

Response SuccessWith(std::string_view data, const Remarks& remarks) {
  return {200, R"({"success":true,"data":)" + std::string(data) + Besides(remarks) + "}", {}};
}

Response Failure(int status, int code, std::string_view text, const Json::Value& details, const Remarks& remarks) {
  std::string body = R"({"success":false,"error":{"code":)" + std::to_string(code) + R"(,"text":)" +
                     WriteJson(Json::Value(text.data(), text.data() + text.size()));
  if (!details.isNull()) body += R"(,"details":)" + WriteJson(details);
  body += Member("reasons", remarks.reasons) + "}" + Besides(remarks) + "}";
  Response response{status, std::move(body), {}};
  response.error_code = code;
  return response;
}

Response Refusal(int status, std::string_view text) { return Failure(status, status, text); }

Response Unauthenticated(std::string_view text) {
  Response response = Refusal(401, text);
  response.headers.emplace_back("WWW-Authenticate", "Bearer");
  return response;
}

Response InternalFailure() noexcept {
  try {
    return Failure(500, kInternalFailure, "The operation failed inside the server; its log says more.");
  } catch (...) {
    Response response;
    response.status = 500;
    response.error_code = kInternalFailure;
    return response;
  }
}

Response Busy(std::string_view text) {
  Response response = Refusal(503, text);
  response.headers.emplace_back("Retry-After", "1");
  return response;
}

}  // namespace vorn::server
