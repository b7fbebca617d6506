// One connection: a request is read, authorised, run and answered, then the next.
#ifndef VORN_SERVER_SESSION_H
#define VORN_SERVER_SESSION_H

#include <boost/beast/core/flat_buffer.hpp>
#include <chrono>
#include <cstddef>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "budget.h"
#include "http.h"
#include "mailbox.h"
#include "recent_count.h"
#include "request_reader.h"
#include "response_writer.h"
#include "stream.h"

namespace vorn::server {

class Session;

// The services that all sessions share. They are used on the network thread only.
class SessionHost {
 public:
  virtual ~SessionHost() = default;
  virtual Service& service() = 0;
  virtual const HttpLimits& limits() const = 0;
  virtual Budget* bodies() = 0;  // may be null, as the log
  virtual AccessLog* log() = 0;
  virtual const std::shared_ptr<Mailbox>& mailbox() = 0;
  virtual bool stopping() const = 0;
  virtual const std::string& date() = 0;             // for the Date header
  virtual std::string strict_transport() const = 0;  // for Strict-Transport-Security; may be empty
  virtual void DispatchLater() = 0;                  // calls Service::Dispatch() after the events that are pending
  virtual void Forget(const std::shared_ptr<Session>& session) = 0;
};

// Used on the network thread only. Other threads communicate with a session through letters of its mailbox.
class Session : public std::enable_shared_from_this<Session> {
 public:
  using Clock = std::chrono::steady_clock;

  // The host must outlive the session.
  Session(SessionHost& host, std::unique_ptr<Stream> stream, Peer peer, std::size_t listener);

  void Start();

  // Answers 503 and closes the connection, which was accepted beyond the limit. One without a handshake is closed.
  void TurnAway();

  // Called when the server stops: closes the connection now, or after the answer to the running request.
  void Stop();
  void Close() noexcept;

  // Called once a second: applies the deadline, and tells a running call if its client has left.
  void Tick(Clock::time_point now);

  std::size_t listener() const { return listener_; }  // an index into the server's listeners
  ConnectionUse UseAt(Clock::time_point now) const;

 private:
  using Error = Stream::Error;
  enum class Phase { kIdle, kHead, kAuthorize, kBody, kCall, kWrite, kDrain };

  template <typename Step>
  void Guard(const Step& step);
  Stream::Done Then(void (Session::*step)(const Error& error, std::size_t bytes));
  std::shared_ptr<Letter> LetterTo(void (Session::*step)(std::optional<Response> response));

  std::chrono::seconds LimitOf(Phase phase) const;
  void Enter(Phase phase);
  void Expire();
  bool IsTooSlow(Clock::time_point now) const;

  void OnBegun(const Error& error, std::size_t bytes);
  void Read();
  void OnRead(const Error& error, std::size_t bytes);
  void Advance();
  void BeginExchange();
  void Authorize();
  void OnAuthorized(std::optional<Response> refusal);
  std::size_t BodyCharge() const;
  bool ChargeBody();
  void RefuseBody();
  void OnContinueSent(const Error& error, std::size_t bytes);
  void Run();
  void OnAnswer(std::optional<Response> response);

  void Refuse(int status, std::string_view text);
  void RefuseForNow(std::string_view text);
  void Reply(Response response);
  void AddStrictTransport();
  void Send(Response response);
  void OnSent(const Error& error, std::size_t bytes);
  void SendMore();
  void Finish();
  void Drain();
  void Log() noexcept;

  SessionHost& host_;
  const std::unique_ptr<Stream> stream_;
  const Peer peer_;
  const std::string share_key_;  // Peer::ShareKey()
  const std::size_t listener_;

  Phase phase_ = Phase::kHead;
  Clock::time_point since_;     // of the phase
  Clock::time_point deadline_;  // of the phase
  bool closed_ = false;
  bool begun_ = false;       // the handshake of the stream is complete
  bool reading_ = false;     // a read is under way
  bool continuing_ = false;  // "100 Continue" is being written

  RecentCount requests_;
  boost::beast::flat_buffer buffer_;
  RequestReader reader_;
  AnswerForm form_;
  std::shared_ptr<Exchange> exchange_;
  std::optional<Charge> charge_;
  std::uint64_t body_charge_ = 0;  // what the body of the request costs
  std::uint64_t body_bytes_ = 0;   // of it have been received
  bool abandoned_ = false;

  Response response_;
  std::string text_;  // what is being written besides the response's body
  bool keep_alive_ = false;
  bool ended_ = false;  // the last piece of a generated body has been written
  AccessRecord record_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_SESSION_H
