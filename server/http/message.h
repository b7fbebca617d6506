// The head of a request, and the response to it.
#ifndef VORN_SERVER_MESSAGE_H
#define VORN_SERVER_MESSAGE_H

#include <sys/types.h>

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "peer.h"

namespace vorn::server {

// A request without its body. All strings live as long as the call that the head is passed to.
struct Head {
  std::string_view method;               // "GET", in the sender's case
  std::string_view target;               // the path: "/api/..."; "*" for the server as a whole
  std::string_view query;                // what follows the '?' of the target
  std::optional<std::string_view> host;  // of an absolute target, else of the Host header (RFC 9112, 3.2.2)
  std::string_view content_type;         // empty if there is none
  bool has_body = false;
  std::uint64_t content_length = 0;                                    // 0 also for a body of unknown length
  std::vector<std::pair<std::string_view, std::string_view>> headers;  // all, in the order sent
  Peer peer;
  unsigned recent_requests = 0;  // that were sent on this connection before, where each second halves their number
  bool secure = false;           // the connection has TLS

  // Returns the value of the first header with this name; names are compared case-insensitively.
  std::optional<std::string_view> Header(std::string_view name) const;
  std::size_t Count(std::string_view name) const;
};

// A response body that is produced while it is sent. Used by the network thread alone, so Read() must not block.
class BodySource {
 public:
  virtual ~BodySource() = default;

  // The number of bytes that Read() will return in total; std::nullopt if it is not known.
  virtual std::optional<std::uint64_t> Size() const = 0;

  // Writes up to `size` bytes to `data` and returns their number; 0 at the end; negative on failure, which
  // ends the connection, so that the client does not take a truncated body for a whole one.
  virtual ssize_t Read(char* data, std::size_t size) = 0;
};

struct Response {
  int status = 200;
  std::string body;
  std::vector<std::pair<std::string, std::string>> headers{};  // beyond those of framing and type
  std::string_view content_type = "application/json";          // of static lifetime
  std::shared_ptr<BodySource> source{};                        // if not null, sent instead of `body`

  // For the logs: the authenticated caller, the error code (0 for success), and when a worker began with the call.
  std::string caller{};
  int error_code = 0;
  std::chrono::steady_clock::time_point begun{};
};

// Returns a source of the content of a regular file; nullptr with errno set if it cannot be opened.
std::shared_ptr<BodySource> OpenFileBody(const std::string& path);

}  // namespace vorn::server

#endif  // VORN_SERVER_MESSAGE_H
