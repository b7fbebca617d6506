#include "session.h"

#include <syslog.h>

#include <algorithm>
#include <charconv>
#include <exception>
#include <new>
#include <utility>
#include <variant>

namespace vorn::server {
namespace {

constexpr std::size_t kReadBytes = std::size_t{8} * 1024;
// A connection that has just been opened, or answered, is about to be used. If it counted as idle, it would go before
// clients that have been sending a request for a minute.
constexpr std::chrono::seconds kIdleAfter{1};
constexpr std::size_t kWriteBytes = std::size_t{64} * 1024;  // of a generated body at a time

std::chrono::microseconds Between(Session::Clock::time_point begin, Session::Clock::time_point end) {
  return std::chrono::duration_cast<std::chrono::microseconds>(end - begin);
}

// A chunk of a body (RFC 9112, 7.1); of no bytes: the last one.
std::string Chunk(std::string_view data) {
  char size[sizeof(std::size_t) * 2];
  const char* const end = std::to_chars(std::begin(size), std::end(size), data.size(), 16).ptr;
  return std::string(static_cast<const char*>(size), end).append("\r\n").append(data).append("\r\n");
}

}  // namespace

Session::Session(SessionHost& host, std::unique_ptr<Stream> stream, Peer peer, std::size_t listener)
    : host_(host),
      stream_(std::move(stream)),
      peer_(std::move(peer)),
      share_key_(peer_.ShareKey()),
      listener_(listener),
      reader_(host.limits().head_bytes) {}

// A failure of one connection, for example std::bad_alloc, ends only that connection.
template <typename Step>
void Session::Guard(const Step& step) {
  if (closed_) return;
  try {
    step();
  } catch (const std::exception& exception) {
    syslog(LOG_ERR, "A connection from %s ends: %s", peer_.address.c_str(), exception.what());
    Close();
  }
}

Stream::Done Session::Then(void (Session::*step)(const Error& error, std::size_t bytes)) {
  return [self = shared_from_this(), step](const Error& error, std::size_t bytes) {
    self->Guard([&] { (self.get()->*step)(error, bytes); });
  };
}

// The letter does not own the session, which must be destroyed on the network thread.
std::shared_ptr<Letter> Session::LetterTo(void (Session::*step)(std::optional<Response> response)) {
  auto letter = std::make_shared<Letter>();
  letter->deliver = [weak = weak_from_this(), step](std::optional<Response> response) {
    if (const auto self = weak.lock()) self->Guard([&] { (self.get()->*step)(std::move(response)); });
  };
  return letter;
}

void Session::Start() {
  Enter(Phase::kHead);
  Guard([this] { stream_->Begin(Then(&Session::OnBegun)); });
}

void Session::OnBegun(const Error& error, std::size_t /*bytes*/) {
  begun_ = !error;
  error ? Close() : Read();
}

std::chrono::seconds Session::LimitOf(Phase phase) const {
  const HttpLimits& limits = host_.limits();
  switch (phase) {
    case Phase::kIdle:
      return limits.idle;
    case Phase::kHead:
      return limits.head;
    case Phase::kBody:
      return limits.body;
    case Phase::kWrite:
      return host_.stopping() ? limits.last_write : limits.write;
    case Phase::kDrain:
      return limits.drain;
    case Phase::kAuthorize:
    case Phase::kCall:
      break;
  }
  return std::chrono::hours(24 * 365);  // the service has its own limits
}

void Session::Enter(Phase phase) {
  phase_ = phase;
  since_ = Clock::now();
  deadline_ = since_ + LimitOf(phase);
}

void Session::TurnAway() {
  if (!begun_) return Close();  // an answer would need the handshake
  Guard([this] { RefuseForNow("Too many connections wait for an answer. Try again soon."); });
}

void Session::Stop() {
  if (phase_ == Phase::kCall || phase_ == Phase::kDrain) return;
  if (phase_ != Phase::kWrite) return Close();
  deadline_ = std::min(deadline_, Clock::now() + host_.limits().last_write);
}

void Session::Close() noexcept {
  if (closed_) return;
  if (phase_ == Phase::kWrite) Log();
  closed_ = true;
  stream_->Close();
  host_.Forget(shared_from_this());
}

void Session::Tick(Clock::time_point now) {
  Guard([this, now] {
    if (now >= deadline_ || IsTooSlow(now)) return Expire();
    const bool waiting = phase_ == Phase::kCall && !abandoned_ && now - since_ >= std::chrono::seconds(1);
    if (!waiting || !stream_->PeerHasLeft()) return;
    abandoned_ = true;
    exchange_->Abandon();
  });
}

bool Session::IsTooSlow(Clock::time_point now) const {
  const HttpLimits& limits = host_.limits();
  if (phase_ != Phase::kBody || !charge_ || now < since_ + limits.body_grace) return false;
  const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(now - since_ - limits.body_grace);
  return body_bytes_ < static_cast<std::uint64_t>(seconds.count()) * limits.body_rate;
}

void Session::Expire() {
  const bool incomplete = (phase_ == Phase::kHead && reader_.begun()) || phase_ == Phase::kBody;
  if (!incomplete || continuing_) return Close();
  Refuse(408, "The request did not arrive in time.");
}

ConnectionUse Session::UseAt(Clock::time_point now) const {
  ConnectionUse use{share_key_, Activity::kWaiting, since_};
  if (phase_ == Phase::kDrain) use.activity = Activity::kEnding;
  const bool between = phase_ == Phase::kIdle || (phase_ == Phase::kHead && !reader_.begun());
  if (between && now - since_ > kIdleAfter) use.activity = Activity::kIdle;
  if (phase_ == Phase::kCall || phase_ == Phase::kAuthorize) use.activity = Activity::kWorking;
  return use;
}

void Session::Read() {
  if (reading_) return;
  const std::size_t room = host_.limits().head_bytes + kReadBytes - buffer_.size();
  if (room == 0) return Refuse(400, "A line between the chunks is too long.");
  const auto space = buffer_.prepare(std::min(room, kReadBytes));
  stream_->ReadSome(space, Then(&Session::OnRead));
  reading_ = true;
}

void Session::OnRead(const Error& error, std::size_t bytes) {
  reading_ = false;
  if (phase_ == Phase::kWrite) return;  // the request was answered before its end
  if (error) return Close();
  if (phase_ == Phase::kDrain) return Drain();
  buffer_.commit(bytes);
  if (phase_ == Phase::kBody) body_bytes_ += bytes;
  Advance();
}

// Processes the bytes that have arrived.
void Session::Advance() {
  if (phase_ == Phase::kIdle && buffer_.size() > 0) Enter(Phase::kHead);
  switch (reader_.Read(buffer_)) {
    case RequestReader::State::kFault:
      return Refuse(reader_.fault().status, reader_.fault().text);
    case RequestReader::State::kRefused:
      return Reply(reader_.TakeRefusal());
    case RequestReader::State::kHead:
      return Read();
    case RequestReader::State::kBody:
      return phase_ == Phase::kHead ? BeginExchange() : Read();
    case RequestReader::State::kDone:
      return phase_ == Phase::kHead ? BeginExchange() : Run();
  }
}

void Session::BeginExchange() {
  Head head = reader_.MakeHead();
  head.peer = peer_;
  head.recent_requests = requests_.Add(since_);
  head.secure = stream_->IsSecure();
  form_ = FormOf(head, reader_.is_old());
  record_.method = head.method;
  record_.target = head.target;
  body_charge_ = head.content_length == 0 && head.has_body ? host_.limits().largest_charge : head.content_length;
  auto begun = host_.service().Begin(head);
  if (auto* answer = std::get_if<Response>(&begun)) return Reply(std::move(*answer));
  exchange_ = std::get<std::shared_ptr<Exchange>>(std::move(begun));
  Authorize();
}

void Session::Authorize() {
  Enter(Phase::kAuthorize);
  const auto letter = LetterTo(&Session::OnAuthorized);
  const auto decided = exchange_->Authorize([letter, mailbox = host_.mailbox()](std::optional<Response> refusal) {
    letter->response = std::move(refusal);
    mailbox->Send(letter);
  });
  if (decided == Authorization::kGranted) OnAuthorized(std::nullopt);
}

void Session::OnAuthorized(std::optional<Response> refusal) {
  if (phase_ != Phase::kAuthorize) return;
  if (refusal) return Reply(*std::move(refusal));
  if (reader_.state() == RequestReader::State::kBody && !ChargeBody()) return RefuseBody();
  reader_.Attach(exchange_);
  Enter(Phase::kBody);
  body_bytes_ = buffer_.size();
  if (reader_.state() == RequestReader::State::kDone) return Run();
  if (!reader_.expects_continue() || buffer_.size() > 0) return Advance();
  continuing_ = true;
  static constexpr std::string_view kContinue = "HTTP/1.1 100 Continue\r\n\r\n";
  stream_->Write({boost::asio::buffer(kContinue), {}}, Then(&Session::OnContinueSent));
}

std::size_t Session::BodyCharge() const {
  return static_cast<std::size_t>(std::min<std::uint64_t>(body_charge_, host_.limits().largest_charge));
}

bool Session::ChargeBody() {
  if (host_.bodies() == nullptr || body_charge_ <= host_.limits().uncharged_body) return true;
  charge_ = host_.bodies()->Take(share_key_, BodyCharge());
  return charge_.has_value();
}

void Session::RefuseBody() {
  if (host_.bodies()->HasRoomFor(share_key_, BodyCharge())) {
    return RefuseForNow("Too much is being sent to this server. Try again soon.");
  }
  Refuse(413, "The settings of this server leave no memory for a body of this size, or of unknown length.");
}

void Session::OnContinueSent(const Error& error, std::size_t /*bytes*/) {
  continuing_ = false;
  error ? Close() : Read();
}

void Session::Run() {
  Enter(Phase::kCall);
  abandoned_ = false;
  exchange_->Run([letter = LetterTo(&Session::OnAnswer), mailbox = host_.mailbox(), form = form_](Response response) {
    Adapt(form, &response);
    letter->response = std::move(response);
    mailbox->Send(letter);
  });
  host_.DispatchLater();
}

void Session::OnAnswer(std::optional<Response> response) {
  if (phase_ != Phase::kCall) return;
  const auto now = Clock::now();
  const bool queued = response->begun > since_;
  record_.queued = queued ? Between(since_, response->begun) : std::chrono::microseconds(0);
  record_.worked = Between(queued ? response->begun : since_, now);
  Send(*std::move(response));
}

void Session::Refuse(int status, std::string_view text) { Reply(host_.service().Refuse(status, text)); }

void Session::RefuseForNow(std::string_view text) {
  Response busy = host_.service().Refuse(503, text);
  busy.headers.emplace_back("Retry-After", "1");
  Reply(std::move(busy));
}

void Session::Reply(Response response) {
  Adapt(form_, &response);
  Send(std::move(response));
}

void Session::Send(Response response) {
  exchange_.reset();
  reader_.Attach(nullptr);
  charge_.reset();
  response_ = std::move(response);
  if (stream_->IsSecure()) AddStrictTransport();
  const Framing framing = FramingOf(form_, response_);
  // A client that sends more than can be served must not take the next place in a queue before those who wait.
  const bool overloads = response_.status == 503;
  keep_alive_ = reader_.IsReusable() && framing != Framing::kClose && !host_.stopping() && !overloads;
  ended_ = !response_.source || form_.is_head || framing == Framing::kNone;
  Enter(Phase::kWrite);
  text_ = WriteHead(form_, response_, keep_alive_, host_.date());
  const bool has_body = !response_.source && !form_.is_head && framing != Framing::kNone;
  const auto body = has_body ? boost::asio::buffer(std::as_const(response_.body)) : boost::asio::const_buffer();
  record_.status = response_.status;
  record_.bytes = body.size();
  stream_->Write({boost::asio::buffer(std::as_const(text_)), body}, Then(&Session::OnSent));
}

void Session::AddStrictTransport() {
  std::string value = host_.strict_transport();
  if (!value.empty()) response_.headers.emplace_back("Strict-Transport-Security", std::move(value));
}

void Session::OnSent(const Error& error, std::size_t /*bytes*/) {
  if (error) return Close();
  ended_ ? Finish() : SendMore();
}

void Session::SendMore() {
  std::string data(kWriteBytes, '\0');
  const ssize_t count = response_.source->Read(data.data(), data.size());
  if (count < 0) return Close();
  data.resize(static_cast<std::size_t>(count));
  record_.bytes += data.size();
  ended_ = data.empty();
  text_ = FramingOf(form_, response_) == Framing::kChunked ? Chunk(data) : std::move(data);
  if (text_.empty()) return Finish();
  Enter(Phase::kWrite);
  stream_->Write({boost::asio::buffer(std::as_const(text_)), {}}, Then(&Session::OnSent));
}

void Session::Finish() {
  Log();
  response_ = {};
  if (!keep_alive_) {
    // Closing a connection with unread bytes resets it, and the client may lose the answer.
    Enter(Phase::kDrain);
    stream_->FinishSending();
    return Drain();
  }
  if (host_.stopping()) return Close();
  record_ = {};
  form_ = {};
  reader_.Reset();
  Enter(Phase::kIdle);
  Advance();
}

void Session::Drain() {
  buffer_.clear();
  Read();
}

// If there is no memory for the record, the request is not logged.
void Session::Log() noexcept {
  if (host_.log() == nullptr) return;
  try {
    record_.caller = std::move(response_.caller);
    record_.peer = peer_;
    host_.log()->Add(std::move(record_));
  } catch (const std::bad_alloc&) {
    host_.log()->Drop();
  }
}

}  // namespace vorn::server
