// The HTTP/1.1 server: connections, framing, deadlines and limits. What a request means is a Service's business.
// One network thread serves all connections; it never waits for anything but the network.
#ifndef VORN_SERVER_HTTP_H
#define VORN_SERVER_HTTP_H

#include <sys/resource.h>

#include <chrono>
#include <cstddef>
#include <memory>
#include <vector>

#include "access_log.h"
#include "budget.h"
#include "listener.h"
#include "service.h"
#include "shares.h"
#include "tls.h"

namespace vorn::server {

struct HttpLimits {
  std::size_t head_bytes = std::size_t{16} * 1024;

  // Connections of each listener. When one more arrives, the most expendable is closed: see shares.h.
  ConnectionShare tcp_connections{512, 128};
  ConnectionShare unix_connections{320, 320};

  // Bodies are charged to a budget before they are read, by the length that is declared for them. A body
  // that does not fit is refused with 503 and Retry-After, one that could never fit with 413.
  std::size_t uncharged_body = std::size_t{8} * 1024;     // bodies of up to this size are not charged
  std::size_t largest_charge = std::size_t{1088} * 1024;  // for larger bodies and those of unknown length

  // A charged body arrives with at least `body_rate` bytes a second on average, after the first `body_grace`.
  std::size_t body_rate = std::size_t{16} * 1024;
  std::chrono::seconds body_grace{5};

  // A connection is closed within about a second after its deadline; a request that is incomplete then is answered
  // with 408.
  std::chrono::seconds head{10};   // from a request's first byte, or from the connection's begin, to its last header
  std::chrono::seconds body{60};   // from there to the end of the body
  std::chrono::seconds idle{60};   // between two requests
  std::chrono::seconds write{60};  // for the client to take an answer, or 64 KiB of it
  std::chrono::seconds drain{2};   // to read on after the last answer, so that the client sees it
  std::chrono::seconds last_write{2};  // for the client to take an answer after Stop()
};

// The limits with as many connections as `descriptors` leaves room for, beside a reserve for the server's own files.
HttpLimits FitToDescriptors(HttpLimits limits, const std::vector<Listener>& listeners, rlim_t descriptors);

// The number of descriptors that this process may have open: the soft limit (getrlimit(2)).
rlim_t DescriptorLimit();

// The objects that a server shares with the rest of the program. They must outlive the server.
struct HttpParts {
  Budget* bodies = nullptr;  // null: bodies are not charged
  AccessLog* log = nullptr;  // null: no access log
  TlsServer* tls = nullptr;  // needed if a listener has TLS
};

// Serves from construction until Stop() and Join(). The service must outlive it. All functions are thread-safe.
class HttpServer {
 public:
  HttpServer(Service& service, std::vector<Listener> listeners, HttpLimits limits = {}, HttpParts parts = {});
  // Closes all connections, also those whose request is running: their answers are dropped.
  ~HttpServer();
  HttpServer(const HttpServer&) = delete;
  HttpServer& operator=(const HttpServer&) = delete;

  // Accepts no more connections and closes those without a whole request; the others are closed after their answer.
  // Returns immediately.
  void Stop();

  // After Stop(): waits until every request that had been read is answered.
  void Join();
  bool JoinFor(std::chrono::milliseconds limit);  // false if that took longer

 private:
  class Engine;
  std::unique_ptr<Engine> engine_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_HTTP_H
