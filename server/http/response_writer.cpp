#include "response_writer.h"

#include <zlib.h>

#include <algorithm>
#include <boost/beast/http/status.hpp>
#include <cstdlib>
#include <ctime>
#include <new>
#include <optional>
#include <ostream>  // for the Boost header
#include <utility>

#include "header_value.h"

namespace vorn::server {
namespace {

constexpr std::string_view kCodedSuffix = "-gzip\"";

// Whether the weight of an element of Accept-Encoding is zero: "gzip;q=0" (RFC 9110, 12.4.2).
bool IsRefused(const HeaderValue& element) {
  const auto weight = element.parameters.find("q");
  return weight != element.parameters.end() && std::strtod(weight->second.c_str(), nullptr) <= 0;
}

bool AcceptsGzip(std::string_view accepted) {
  bool named = false;
  bool any = false;
  bool refused = false;
  ForEachElement(accepted, [&](std::string_view text) {
    const auto element = ParseHeaderValue(text);
    if (!element) return;
    const bool is_gzip = element->value == "gzip" || element->value == "x-gzip";
    if (is_gzip) (IsRefused(*element) ? refused : named) = true;
    if (element->value == "*") any = !IsRefused(*element);
  });
  return named || (any && !refused);
}

// Weak comparison of entity tags, as If-None-Match requires (RFC 9110, 13.1.2).
bool IsKnown(const std::string& known_versions, std::string_view tag) {
  const auto strong = [](std::string_view text) { return text.substr(0, 2) == "W/" ? text.substr(2) : text; };
  bool known = TrimBlanks(known_versions) == "*";
  ForEachElement(known_versions, [&](std::string_view text) { known = known || strong(text) == strong(tag); });
  return known;
}

std::string* FindHeader(Response& response, std::string_view name) {
  for (auto& [header, value] : response.headers) {
    if (EqualsIgnoringCase(header, name)) return &value;
  }
  return nullptr;
}

const std::string* FindHeader(const Response& response, std::string_view name) {
  return FindHeader(const_cast<Response&>(response), name);
}

// std::nullopt if zlib has no memory or the text does not become shorter.
std::optional<std::string> Gzip(const std::string& text) {
  z_stream stream{};
  constexpr int kGzipFormat = 16;
  // Level 1: answers are sent once, and JSON shrinks to a tenth at any level.
  if (deflateInit2(&stream, 1, Z_DEFLATED, MAX_WBITS + kGzipFormat, MAX_MEM_LEVEL - 1, Z_DEFAULT_STRATEGY) != Z_OK) {
    return std::nullopt;
  }
  std::optional<std::string> packed;
  try {
    packed.emplace(text.size(), '\0');
    stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(text.data()));
    stream.avail_in = static_cast<uInt>(text.size());
    stream.next_out = reinterpret_cast<Bytef*>(packed->data());
    stream.avail_out = static_cast<uInt>(packed->size());
    if (deflate(&stream, Z_FINISH) != Z_STREAM_END) packed.reset();
    if (packed) packed->resize(stream.total_out);
  } catch (const std::bad_alloc&) {
    packed.reset();
  }
  deflateEnd(&stream);
  return packed;
}

void Compress(Response* response) {
  std::optional<std::string> packed = Gzip(response->body);
  if (!packed) return;
  if (std::string* tag = FindHeader(*response, "ETag")) *tag = CodedTag(*tag);
  response->headers.emplace_back("Content-Encoding", "gzip");
  response->body = *std::move(packed);
}

void AddLine(std::string* head, std::string_view name, std::string_view value) {
  head->append(name).append(": ").append(value).append("\r\n");
}

}  // namespace

AnswerForm FormOf(const Head& head, bool is_old) {
  AnswerForm form;
  form.accepts_gzip = AcceptsGzip(head.Header("Accept-Encoding").value_or(""));
  form.is_head = head.method == "HEAD";
  form.is_old = is_old;
  if (form.is_head || head.method == "GET") form.known_versions = head.Header("If-None-Match").value_or("");
  return form;
}

void Adapt(const AnswerForm& form, Response* response) noexcept {
  try {
    const std::string* version = FindHeader(*response, "ETag");
    if (response->status == 200 && version != nullptr && !form.known_versions.empty() &&
        IsKnown(form.known_versions, *version)) {
      response->status = 304;
      response->body.clear();
      response->source.reset();
      return;
    }
    const bool coded = FindHeader(*response, "Content-Encoding") != nullptr;
    if (response->source || coded || response->body.size() <= kCompressedFrom) return;
    response->headers.emplace_back("Vary", "Accept-Encoding");
    if (form.accepts_gzip) Compress(response);
  } catch (const std::bad_alloc&) {
    // Without memory the body is sent as it is.
  }
}

Framing FramingOf(const AnswerForm& form, const Response& response) {
  if (response.status == 304 || response.status == 204) return Framing::kNone;
  if (!response.source || response.source->Size()) return Framing::kLength;
  return form.is_old ? Framing::kClose : Framing::kChunked;
}

std::string WriteHead(const AnswerForm& form, const Response& response, bool keep_alive, std::string_view date) {
  const auto reason = boost::beast::http::obsolete_reason(static_cast<boost::beast::http::status>(response.status));
  std::string head;
  head.reserve(320);
  head.append("HTTP/1.1 ").append(std::to_string(response.status)).append(" ");
  head.append(reason.data(), reason.size()).append("\r\n");
  AddLine(&head, "Date", date);
  const Framing framing = FramingOf(form, response);
  if (framing != Framing::kNone) AddLine(&head, "Content-Type", response.content_type);
  if (FindHeader(response, "Cache-Control") == nullptr) AddLine(&head, "Cache-Control", "no-store");
  AddLine(&head, "X-Content-Type-Options", "nosniff");
  for (const auto& [name, value] : response.headers) AddLine(&head, name, value);
  if (!keep_alive) AddLine(&head, "Connection", "close");
  if (keep_alive && form.is_old) AddLine(&head, "Connection", "keep-alive");
  if (framing == Framing::kChunked) AddLine(&head, "Transfer-Encoding", "chunked");
  if (framing == Framing::kLength) {
    const std::uint64_t size = response.source ? *response.source->Size() : response.body.size();
    AddLine(&head, "Content-Length", std::to_string(size));
  }
  return head.append("\r\n");
}

// Another representation of the same data needs another strong tag (RFC 9110, 8.8.3.3).
std::string CodedTag(const std::string& tag) {
  if (tag.empty() || tag.front() != '"') return tag;
  return tag.substr(0, tag.size() - 1) + std::string(kCodedSuffix);
}

std::string UncodedTag(std::string_view tag) {
  const std::size_t suffix = tag.size() - std::min(tag.size(), kCodedSuffix.size());
  if (tag.substr(suffix) != kCodedSuffix) return std::string(tag);
  return std::string(tag.substr(0, suffix)) + '"';
}

std::string HttpDate() {
  const std::time_t now = std::time(nullptr);
  std::tm utc{};
  char text[32];
  std::strftime(text, sizeof text, "%a, %d %b %Y %H:%M:%S GMT", gmtime_r(&now, &utc));
  return text;
}

}  // namespace vorn::server
