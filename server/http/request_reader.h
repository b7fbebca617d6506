// Incremental reading of requests: framing by Boost.Beast, and the rules of RFC 9112 that Beast does not enforce.
#ifndef VORN_SERVER_REQUEST_READER_H
#define VORN_SERVER_REQUEST_READER_H

#include <boost/beast/core/flat_buffer.hpp>
#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "service.h"

namespace vorn::server {

// Reads one request at a time from a buffer.
class RequestReader {
 public:
  enum class State {
    kHead,     // the head is not complete
    kBody,     // the head is complete, the body is not
    kDone,     // the request is complete
    kFault,    // the bytes are not a request that may be answered otherwise: see fault()
    kRefused,  // the exchange has refused the body: see TakeRefusal()
  };
  struct Fault {
    int status = 0;
    std::string text;
  };

  explicit RequestReader(std::size_t head_bytes);
  ~RequestReader();

  // Begins the next request.
  void Reset();

  // Consumes from `buffer` what belongs to the request. Returns after the head, and then again when all available
  // bytes of the body are consumed.
  State Read(boost::beast::flat_buffer& buffer);

  State state() const { return state_; }
  const Fault& fault() const { return fault_; }
  Response TakeRefusal();

  // Whether a byte of the request has been read.
  bool begun() const { return begun_; }

  // Whether the next request can be read from the same connection: the head is valid, the request has been read to its
  // end, and the client keeps the connection open.
  bool IsReusable() const;

  // Whether the client waits for "100 Continue" before it sends the body (RFC 9110, 10.1.1).
  bool expects_continue() const { return expects_continue_; }
  bool is_old() const;  // HTTP/1.0
  bool is_head_request() const;

  // Valid once the head is complete, until Reset(); the peer is left to the caller.
  Head MakeHead() const;

  void Attach(std::shared_ptr<Exchange> exchange);

 private:
  struct Parsing;  // hides Boost.Beast's parser, which is slow to compile

  bool SkipToRequestLine(boost::beast::flat_buffer& buffer);
  State Fail(int status, std::string text);
  State CheckHead();
  std::optional<Fault> FindFault() const;

  const std::size_t head_limit_;
  const std::unique_ptr<Parsing> parsing_;
  State state_ = State::kHead;
  Fault fault_;
  std::size_t head_bytes_ = 0;
  bool begun_ = false;
  bool has_line_ = false;  // the complete request line has been received
  bool sound_ = false;     // the head is valid
  bool expects_continue_ = false;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_REQUEST_READER_H
