#include "answer.h"

#include <json/writer.h>

#include <memory>
#include <sstream>
#include <string>

namespace vorn::server {
namespace {

std::unique_ptr<Json::StreamWriter> NewWriter() {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  // All but ASCII is escaped: a module's text that is no UTF-8 still makes valid JSON.
  builder["emitUTF8"] = false;
  return std::unique_ptr<Json::StreamWriter>(builder.newStreamWriter());
}

std::string Text(const Json::Value& value) {
  // Making a writer costs more than most answers.
  thread_local const std::unique_ptr<Json::StreamWriter> writer = NewWriter();
  std::ostringstream text;
  writer->write(value, &text);
  return text.str();
}

}  // namespace

Response Success(const Json::Value& data) { return {200, R"({"success":true,"data":)" + Text(data) + "}", {}}; }

Response Failure(int status, int code, std::string_view text, const Json::Value& details) {
  std::string body = R"({"success":false,"error":{"code":)" + std::to_string(code) + R"(,"text":)" +
                     Text(Json::Value(text.data(), text.data() + text.size()));
  if (!details.isNull()) body += R"(,"details":)" + Text(details);
  return {status, body + "}}", {}};
}

Response Refusal(int status, std::string_view text) { return Failure(status, status, text); }

}  // namespace vorn::server
