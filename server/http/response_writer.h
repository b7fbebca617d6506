// Serialises responses (RFC 9112), compressed or without a body if the client asks for that.
#ifndef VORN_SERVER_RESPONSE_WRITER_H
#define VORN_SERVER_RESPONSE_WRITER_H

#include <cstddef>
#include <string>
#include <string_view>

#include "message.h"

namespace vorn::server {

// Bodies of up to this size are not compressed: the headers would be most of the answer.
constexpr std::size_t kCompressedFrom = 1024;

// The properties of a request that decide the form of its answer.
struct AnswerForm {
  bool accepts_gzip = false;
  bool is_head = false;          // the headers alone are asked for
  bool is_old = false;           // HTTP/1.0
  std::string known_versions{};  // If-None-Match of a GET or HEAD request
};

AnswerForm FormOf(const Head& head, bool is_old);

// Turns the answer into "304 Not Modified" if the client has this version of it (RFC 9110, 13.1.2), else compresses
// a large body if the client accepts that. Does not throw: without memory the answer stays as it is. Thread-safe.
void Adapt(const AnswerForm& form, Response* response) noexcept;

// The framing of a body.
enum class Framing { kNone, kLength, kChunked, kClose };
Framing FramingOf(const AnswerForm& form, const Response& response);

// The status line, all headers and the empty line after them.
std::string WriteHead(const AnswerForm& form, const Response& response, bool keep_alive, std::string_view date);

// The strong entity tag of a compressed answer; `tag` is the one of the same answer without a content coding. A weak
// tag is the same for both.
std::string CodedTag(const std::string& tag);

// The entity tag of the same answer without a content coding: the transport gives a compressed answer a tag of its own,
// and a client sends that back.
std::string UncodedTag(std::string_view tag);

// The Date header's value for this moment.
std::string HttpDate();

}  // namespace vorn::server

#endif  // VORN_SERVER_RESPONSE_WRITER_H
