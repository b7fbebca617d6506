// HTTP/1.1 behind our own types: connections, framing and deadlines are this side, what a request
// means is a Service's. One network thread serves every connection and never waits for anything else.
#ifndef VORN_SERVER_HTTP_H
#define VORN_SERVER_HTTP_H

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

#include "listener.h"

namespace vorn::server {

// A request without its body. The texts live as long as the call they are passed to.
struct Head {
  std::string_view method;  // "GET", in the sender's case
  std::string_view target;  // as sent: "/api/..."
  std::optional<std::string_view> host;
  std::optional<std::string_view> origin;
  std::string_view content_type;  // empty when there is none
  bool has_body = false;
  std::uint64_t content_length = 0;  // 0 also for a body of unknown length
  bool over_tcp = false;             // false: over a Unix socket
};

// One answer; its body is JSON.
struct Response {
  int status = 200;
  std::string body;
  std::vector<std::pair<std::string, std::string>> headers;  // beyond those of framing and type
};

using Answer = std::function<void(Response)>;

// What becomes of one request whose head was accepted. The network thread gives it the body piece by
// piece and then runs it.
class Exchange {
 public:
  virtual ~Exchange() = default;

  // A response refuses the request; the rest of the body is then not read.
  virtual std::optional<Response> Receive(std::string_view piece) = 0;

  // The body has ended. Returns at once and calls `answer` exactly once, from any thread.
  virtual void Run(Answer answer) = 0;

  // The client has left before the answer. Called at most once, after Run(). A call that has not begun need not begin;
  // `answer` is still called.
  virtual void Abandon() {}
};

class Service {
 public:
  virtual ~Service() = default;

  // Called for each head, on the network thread: how to go on, or the answer.
  virtual std::variant<std::shared_ptr<Exchange>, Response> Begin(const Head& head) = 0;

  // The answer to a request that the transport itself refuses, in the service's own format. `text`
  // is a sentence for the client. Called on the network thread.
  virtual Response Refuse(int status, std::string_view text) const = 0;
};

struct HttpLimits {
  std::size_t head_bytes = std::size_t{16} * 1024;
  std::size_t connections = 800;  // further ones wait until one ends; below the usual 1024 descriptors
  // A connection is closed about a second after it was due at the latest.
  std::chrono::seconds head{10};   // from a request's first byte (a connection's begin) to its last header
  std::chrono::seconds body{60};   // from there to its end
  std::chrono::seconds idle{60};   // between two requests
  std::chrono::seconds write{60};  // for the client to take an answer
  std::chrono::seconds drain{2};   // to read on after the last answer, so that the client sees it
};

// Serves from construction until Stop and Join. The service must outlive it.
class HttpServer {
 public:
  HttpServer(Service& service, std::vector<Listener> listeners, HttpLimits limits = {});
  ~HttpServer();  // stops and joins
  HttpServer(const HttpServer&) = delete;
  HttpServer& operator=(const HttpServer&) = delete;

  // Accepts no more connections and closes those without a whole request. Returns at once.
  void Stop();

  // Waits until every request that had been read is answered. After Stop only.
  void Join();

 private:
  class Session;
  class Engine;
  std::unique_ptr<Engine> engine_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_HTTP_H
