#include "answer.h"

#include <json/writer.h>

#include <memory>
#include <ostream>
#include <streambuf>
#include <string>
#include <utility>

#include "reusable.h"

namespace vorn::server {
namespace {

// Appends to a string. A std::stringbuf would copy the text once more.
class StringSink : public std::streambuf {
 public:
  std::string Take() { return std::exchange(text_, {}); }

 protected:
  std::streamsize xsputn(const char* data, std::streamsize size) override {
    if (text_.empty()) text_.reserve(kUsualSize);
    text_.append(data, static_cast<std::size_t>(size));
    return size;
  }
  int_type overflow(int_type c) override {
    if (c != traits_type::eof()) text_ += traits_type::to_char_type(c);
    return traits_type::not_eof(c);
  }

 private:
  static constexpr std::size_t kUsualSize = 512;  // of an answer, in bytes

  std::string text_;
};

// Constructing a writer and a stream costs more than writing most answers.
class JsonWriter {
 public:
  JsonWriter() : stream_(&text_) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    // Everything but ASCII is escaped, so that a string that is not UTF-8 still makes valid JSON.
    builder["emitUTF8"] = false;
    writer_.reset(builder.newStreamWriter());
    stream_.exceptions(std::ios::badbit);  // a stream hides std::bad_alloc otherwise
  }

  std::string Write(const Json::Value& value) {
    writer_->write(value, &stream_);
    return text_.Take();
  }

 private:
  StringSink text_;
  std::ostream stream_;
  std::unique_ptr<Json::StreamWriter> writer_;
};

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
  static Reusable<JsonWriter> writers([] { return std::make_unique<JsonWriter>(); });
  return writers.With([&value](JsonWriter& writer) { return writer.Write(value); });
}

Response Success(const Json::Value& data, const Remarks& remarks) { return SuccessWith(WriteJson(data), remarks); }

Response SuccessWith(std::string_view data, const Remarks& remarks) {
  constexpr std::string_view kBegin = R"({"success":true,"data":)";
  const std::string besides = Besides(remarks);
  std::string body;
  body.reserve(kBegin.size() + data.size() + besides.size() + 1);
  body.append(kBegin).append(data).append(besides).append("}");
  return {200, std::move(body), {}};
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
