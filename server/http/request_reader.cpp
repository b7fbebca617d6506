#include "request_reader.h"

#include <algorithm>
#include <boost/beast/core/string.hpp>
#include <boost/beast/http.hpp>
#include <cstdint>
#include <utility>

#include "header_value.h"

namespace vorn::server {
namespace {

namespace beast = boost::beast;
namespace http = boost::beast::http;

using Error = boost::system::error_code;
using Fields = http::fields;

// Passes each piece of a body to the exchange as it arrives (a BodyReader of Boost.Beast).
struct StreamedBody {
  struct value_type {
    std::shared_ptr<Exchange> exchange;
    std::optional<Response> refusal;
  };

  class reader {
   public:
    template <bool is_request, typename AnyFields>
    reader(const http::header<is_request, AnyFields>& /*header*/, value_type& body) : body_(body) {}

    void init(const boost::optional<std::uint64_t>& /*length*/, Error& error) { error = {}; }

    template <typename Buffers>
    std::size_t put(const Buffers& buffers, Error& error) {
      std::size_t taken = 0;
      for (auto buffer : beast::buffers_range_ref(buffers)) {
        taken += buffer.size();
        body_.refusal = body_.exchange->Receive({static_cast<const char*>(buffer.data()), buffer.size()});
        if (body_.refusal) break;
      }
      error = body_.refusal ? Error(http::error::body_limit) : Error();
      return taken;
    }

    void finish(Error& error) { error = {}; }

   private:
    value_type& body_;
  };
};

std::string_view View(beast::string_view text) { return {text.data(), text.size()}; }

bool Is(std::string_view text, std::string_view word) { return EqualsIgnoringCase(text, word); }

// Returns the end of "http://authority" in an absolute target; 0 for other targets (RFC 9112, 3.2).
std::size_t AuthorityEnd(std::string_view target, std::string_view* authority) {
  for (const std::string_view scheme : {"http://", "https://"}) {
    if (!Is(target.substr(0, scheme.size()), scheme)) continue;
    const std::size_t end = std::min(target.find_first_of("/?", scheme.size()), target.size());
    *authority = target.substr(scheme.size(), end - scheme.size());
    return end;
  }
  return 0;
}

// Returns the first Transfer-Encoding other than "chunked"; empty if there is none.
std::string_view UnknownCoding(const Fields& fields) {
  std::string_view unknown;
  const auto range = fields.equal_range(http::field::transfer_encoding);
  for (auto field = range.first; field != range.second; ++field) {
    ForEachElement(View(field->value()), [&unknown](std::string_view coding) {
      if (unknown.empty() && !Is(coding, "chunked")) unknown = coding;
    });
  }
  return unknown;
}

}  // namespace

struct RequestReader::Parsing {
  std::optional<http::request_parser<StreamedBody>> parser;
};

RequestReader::RequestReader(std::size_t head_bytes) : head_limit_(head_bytes), parsing_(std::make_unique<Parsing>()) {
  Reset();
}

RequestReader::~RequestReader() = default;

void RequestReader::Reset() {
  parsing_->parser.emplace();
  parsing_->parser->header_limit(static_cast<std::uint32_t>(head_limit_));
  parsing_->parser->body_limit(boost::none);  // the exchange has its own
  state_ = State::kHead;
  head_bytes_ = 0;
  begun_ = has_line_ = sound_ = expects_continue_ = false;
}

RequestReader::State RequestReader::Read(beast::flat_buffer& buffer) {
  if (buffer.size() > 0) begun_ = true;
  if (!has_line_ && !SkipToRequestLine(buffer)) {
    return buffer.size() < head_limit_ ? State::kHead : Fail(431, "The headers are larger than 16 KiB.");
  }
  while (buffer.size() > 0) {
    Error error;
    const bool in_head = !parsing_->parser->is_header_done();
    const std::size_t taken = parsing_->parser->put(buffer.data(), error);
    buffer.consume(taken);
    // Beast applies its limit to each header by itself.
    if (in_head && (head_bytes_ += taken) > head_limit_) error = http::error::header_limit;
    if (parsing_->parser->get().body().refusal) return state_ = State::kRefused;
    if (error == http::error::need_more) break;
    if (error == http::error::header_limit) return Fail(431, "The headers are larger than 16 KiB.");
    if (error) return Fail(400, "This is not HTTP: " + error.message() + ".");
    if (in_head && parsing_->parser->is_header_done()) return CheckHead();
    if (parsing_->parser->is_done()) return state_ = State::kDone;
  }
  return state_;
}

// Empty lines before a request are skipped (RFC 9112, 2.2), and a minor version above 1 is read as 1 (RFC 9110, 2.5).
// Returns false until the complete request line has been received.
bool RequestReader::SkipToRequestLine(beast::flat_buffer& buffer) {
  for (;;) {
    auto* const text = static_cast<char*>(buffer.data().data());
    const std::string_view line(text, buffer.size());
    if (line.substr(0, 2) == "\r\n") {
      buffer.consume(2);
      continue;
    }
    const std::size_t end = line.find('\n');
    if (end == std::string_view::npos) return false;
    static constexpr std::string_view kVersion = "HTTP/1.";
    const std::size_t digit = end - 2;
    if (end > kVersion.size() + 2 && line[end - 1] == '\r' &&
        line.substr(digit - kVersion.size(), kVersion.size()) == kVersion && line[digit] >= '2' && line[digit] <= '9') {
      text[digit] = '1';
    }
    return has_line_ = true;
  }
}

RequestReader::State RequestReader::Fail(int status, std::string text) {
  fault_ = {status, std::move(text)};
  return state_ = State::kFault;
}

RequestReader::State RequestReader::CheckHead() {
  if (auto fault = FindFault()) {
    fault_ = *std::move(fault);
    return state_ = State::kFault;
  }
  sound_ = true;
  const std::string_view expected = View(parsing_->parser->get()[http::field::expect]);
  if (!expected.empty() && !Is(expected, "100-continue")) return Fail(417, "Only 100-continue can be expected.");
  // An HTTP/1.0 client would interpret "100 Continue" as the answer.
  expects_continue_ = !expected.empty() && !parsing_->parser->is_done() && !is_old();
  return state_ = parsing_->parser->is_done() ? State::kDone : State::kBody;
}

// Refuses ambiguous framing that Beast accepts: two readers of the connection could see different requests.
std::optional<RequestReader::Fault> RequestReader::FindFault() const {
  const auto& request = parsing_->parser->get();
  const auto fault = [](int status, const char* text) { return Fault{status, text}; };
  if (request.count(http::field::host) > 1) return fault(400, "There is more than one Host header.");
  if (request.count(http::field::content_length) > 1)
    return fault(400, "There is more than one Content-Length header.");
  if (request.count(http::field::content_type) > 1) return fault(400, "There is more than one Content-Type header.");
  if (request.version() == 11 && request.count(http::field::host) == 0) {
    return fault(400, "The Host header is missing.");
  }
  std::string_view authority;
  if (AuthorityEnd(View(request.target()), &authority) > 0 &&
      (authority.empty() || authority.find('@') != std::string_view::npos)) {
    return fault(400, "The target names no proper host.");
  }
  const auto encodings = request.count(http::field::transfer_encoding);
  if (encodings > 0) {
    if (is_old()) return fault(400, "HTTP/1.0 has no Transfer-Encoding.");
    if (const std::string_view unknown = UnknownCoding(request); !unknown.empty()) {
      return Fault{501, "The transfer coding \"" + std::string(unknown) + "\" is not supported, only chunked is."};
    }
    if (encodings > 1 || !Is(View(request[http::field::transfer_encoding]), "chunked")) {
      return fault(400, "The body must be chunked exactly once.");
    }
  }
  const std::string_view coding = View(request[http::field::content_encoding]);
  if (!coding.empty() && !Is(coding, "identity")) {
    return Fault{415, "The content coding \"" + std::string(coding) + "\" is not supported; send the body as it is."};
  }
  return std::nullopt;
}

Response RequestReader::TakeRefusal() { return *std::move(parsing_->parser->get().body().refusal); }

bool RequestReader::IsReusable() const {
  return sound_ && parsing_->parser->is_done() && parsing_->parser->keep_alive();
}

bool RequestReader::is_old() const { return parsing_->parser->get().version() < 11; }

bool RequestReader::is_head_request() const { return parsing_->parser->get().method() == http::verb::head; }

Head RequestReader::MakeHead() const {
  const auto& request = parsing_->parser->get();
  Head head;
  for (const auto& field : request) head.headers.emplace_back(View(field.name_string()), View(field.value()));
  head.method = View(request.method_string());
  head.target = View(request.target());
  head.host = head.Header("Host");
  std::string_view authority;
  if (const std::size_t end = AuthorityEnd(head.target, &authority); end > 0) {
    head.host = authority;
    head.target.remove_prefix(end);
    if (head.target.empty()) head.target = head.method == "OPTIONS" ? "*" : "/";
  }
  const std::size_t question = head.target.find('?');
  if (question != std::string_view::npos) {
    head.query = head.target.substr(question + 1);
    head.target = question == 0 ? "/" : head.target.substr(0, question);
  }
  head.content_type = head.Header("Content-Type").value_or("");
  head.has_body = !parsing_->parser->is_done();
  head.content_length = parsing_->parser->content_length().value_or(0);
  return head;
}

void RequestReader::Attach(std::shared_ptr<Exchange> exchange) {
  parsing_->parser->get().body().exchange = std::move(exchange);
}

}  // namespace vorn::server
