// The interface between the transport and the service that answers requests.
//
// For each request the network thread calls Service::Begin, Exchange::Authorize, Exchange::Receive for each piece
// of the body, and Exchange::Run, in this order. A Response at any step is the answer and ends the sequence.
#ifndef VORN_SERVER_SERVICE_H
#define VORN_SERVER_SERVICE_H

#include <functional>
#include <memory>
#include <optional>
#include <string_view>
#include <variant>

#include "message.h"

namespace vorn::server {

// Both may be called from any thread, also after the server's end, and do not throw.
using Answer = std::function<void(Response)>;
using Proceed = std::function<void(std::optional<Response> refusal)>;

enum class Authorization { kGranted, kPending };

// One request whose head was accepted. The transport drops it when the request is answered or its client has left.
class Exchange {
 public:
  virtual ~Exchange() = default;

  // Decides whether the sender may make this request. Called before the client is told to send a body and before
  // any of it is read. Returns immediately: kGranted, or kPending and then `proceed` is called exactly once.
  // NOLINTNEXTLINE(performance-unnecessary-value-param): an override keeps `proceed`.
  virtual Authorization Authorize(Proceed /*proceed*/) { return Authorization::kGranted; }

  // Takes the next piece of the body. A response refuses the request; the rest of the body is then not read.
  virtual std::optional<Response> Receive(std::string_view piece) = 0;

  // The body has ended. Returns immediately and calls `answer` exactly once.
  virtual void Run(Answer answer) = 0;

  // The client has closed its end for a second or more while the answer is awaited. Called at most once, after
  // Run(). A call that has not begun need not begin; `answer` is still called.
  virtual void Abandon() {}
};

class Service {
 public:
  virtual ~Service() = default;

  // Called for each head, on the network thread.
  virtual std::variant<std::shared_ptr<Exchange>, Response> Begin(const Head& head) = 0;

  // Called on the network thread after calls of Exchange::Run(), when every request that had arrived with theirs has
  // been passed on: a service that wakes its threads here wakes them once for all of them. Must not throw.
  virtual void Dispatch() {}

  // Ends one call that waits for a thread: it is answered with 503, and its connection closed. Called on the network
  // thread when calls occupy most connections of a listener and another one has arrived. Returns false if no call
  // waits. Must not throw.
  virtual bool EndWaitingCall() { return false; }

  // The answer to a request that the transport itself refuses, in the service's own format. `text` is a sentence
  // for the client. Called on the network thread.
  virtual Response Refuse(int status, std::string_view text) const = 0;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_SERVICE_H
