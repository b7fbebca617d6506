#include "http.h"

#include <syslog.h>

#include <algorithm>
#include <boost/asio/basic_socket_acceptor.hpp>
#include <boost/asio/basic_stream_socket.hpp>
#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/generic/stream_protocol.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/write.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/core/string.hpp>
#include <boost/beast/http.hpp>
#include <ctime>
#include <thread>
#include <unordered_set>

namespace vorn::server {
namespace {

namespace asio = boost::asio;
namespace beast = boost::beast;
namespace http = boost::beast::http;

using Clock = std::chrono::steady_clock;
using Error = boost::system::error_code;
using Protocol = asio::generic::stream_protocol;  // Unix and TCP alike
using Socket = asio::basic_stream_socket<Protocol, asio::io_context::executor_type>;
using Acceptor = asio::basic_socket_acceptor<Protocol, asio::io_context::executor_type>;

constexpr std::size_t kReadBytes = std::size_t{8} * 1024;

// Hands each piece of a body to the exchange, as it comes.
struct StreamedBody {
  struct value_type {
    std::shared_ptr<Exchange> exchange;
    std::optional<Response> refusal;
  };

  class reader {
   public:
    template <bool is_request, typename Fields>
    reader(const http::header<is_request, Fields>& /*header*/, value_type& body) : body_(body) {}

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

using Parser = http::request_parser<StreamedBody>;
using Request = http::request<StreamedBody>;

std::string_view View(beast::string_view text) { return {text.data(), text.size()}; }

std::optional<std::string_view> Find(const Request& request, http::field name) {
  const auto found = request.find(name);
  if (found == request.end()) return std::nullopt;
  return View(found->value());
}

// What the parser lets pass, but two readers of one connection could take for different requests.
const char* FramingFault(const Request& request) {
  if (request.count(http::field::host) > 1) return "There is more than one Host header.";
  if (request.count(http::field::content_length) > 1) return "There is more than one Content-Length header.";
  if (request.version() == 11 && request.count(http::field::host) == 0) return "The Host header is missing.";
  const auto encodings = request.count(http::field::transfer_encoding);
  if (encodings == 0) return nullptr;
  if (request.version() < 11) return "HTTP/1.0 has no Transfer-Encoding.";
  const bool chunked = beast::iequals(request[http::field::transfer_encoding], "chunked");
  return encodings == 1 && chunked ? nullptr : "The only Transfer-Encoding possible is chunked.";
}

Response Malformed(const Service& service, const Error& error) {
  if (error == http::error::header_limit) return service.Refuse(431, "The headers are larger than 16 KiB.");
  return service.Refuse(400, "This is not HTTP: " + error.message() + ".");
}

std::string HttpDate() {
  const std::time_t now = std::time(nullptr);
  std::tm utc{};
  char text[32];
  std::strftime(text, sizeof text, "%a, %d %b %Y %H:%M:%S GMT", gmtime_r(&now, &utc));
  return text;
}

}  // namespace

// All sessions, the sockets they come from and the clock they are held to. Everything but the
// constructor, the destructor, Stop and Join runs on the network thread.
class HttpServer::Engine {
 public:
  Engine(Service& service, std::vector<Listener> listeners, HttpLimits limits);
  ~Engine();

  void Stop();
  void Join();

  Service& service() { return service_; }
  const HttpLimits& limits() const { return limits_; }
  bool stopping() const { return stopping_; }
  asio::io_context& io() { return io_; }
  const std::string& date();
  void Forget(const std::shared_ptr<Session>& session);

 private:
  struct Door {
    Acceptor acceptor;
    bool over_tcp;
    bool waiting = false;  // for a connection
  };

  void Open(Listener& listener);
  void Accept();
  void AcceptAt(Door& door);
  void OnAccepted(Door& door, const Error& error, Socket socket);
  void OnStop();
  void Finish();
  void Tick();
  void OnTick();

  Service& service_;
  const HttpLimits limits_;
  std::vector<Listener> listeners_;  // kept for the files of Unix sockets
  asio::io_context io_{1};           // one thread runs it
  asio::executor_work_guard<asio::io_context::executor_type> work_{io_.get_executor()};
  asio::basic_waitable_timer<Clock, asio::wait_traits<Clock>, asio::io_context::executor_type> timer_{io_};
  bool ticking_ = false;
  bool stopping_ = false;
  std::vector<std::unique_ptr<Door>> doors_;
  std::unordered_set<std::shared_ptr<Session>> sessions_;
  std::time_t dated_ = 0;
  std::string date_;
  std::thread thread_;
};

// One connection: a request is read, run and answered, then the next.
class HttpServer::Session : public std::enable_shared_from_this<Session> {
 public:
  Session(Engine& engine, Socket socket, bool over_tcp)
      : engine_(engine), socket_(std::move(socket)), over_tcp_(over_tcp) {}

  void Start();
  void Stop();
  void Close();
  bool IsOverdue(Clock::time_point now) const { return now >= deadline_; }

 private:
  enum class Phase { kIdle, kHead, kBody, kCall, kWrite, kDrain };

  void NewRequest();
  std::chrono::seconds LimitOf(Phase phase) const;
  void Enter(Phase phase);
  void Advance();
  std::optional<Response> BeginExchange();
  void Read();
  void OnRead(const Error& error, std::size_t bytes);
  void SendContinue();
  void Run();
  void Send(Response response);
  void OnSent(const Error& error);
  void Drain();

  Head MakeHead() const;
  bool MayGoOn() const;

  Engine& engine_;
  Socket socket_;
  const bool over_tcp_;
  Phase phase_ = Phase::kIdle;
  Clock::time_point deadline_;
  beast::flat_buffer buffer_;
  std::optional<Parser> parser_;
  std::size_t head_bytes_ = 0;    // of this request, read so far
  bool begun_ = false;            // the head is sound, and what follows it a request of its own
  bool awaits_continue_ = false;  // the client sends the body once it is told to
  std::optional<http::response<http::string_body>> message_;
  bool keep_alive_ = false;
};

void HttpServer::Session::Start() {
  NewRequest();
  Enter(Phase::kHead);
  Read();
}

void HttpServer::Session::NewRequest() {
  parser_.emplace();
  parser_->header_limit(static_cast<std::uint32_t>(engine_.limits().head_bytes));
  parser_->body_limit(boost::none);  // the exchange has its own
  head_bytes_ = 0;
  begun_ = false;
}

std::chrono::seconds HttpServer::Session::LimitOf(Phase phase) const {
  const HttpLimits& limits = engine_.limits();
  switch (phase) {
    case Phase::kIdle:
      return limits.idle;
    case Phase::kHead:
      return limits.head;
    case Phase::kBody:
      return limits.body;
    case Phase::kWrite:
      return limits.write;
    case Phase::kDrain:
      return limits.drain;
    case Phase::kCall:
      break;
  }
  return std::chrono::hours(24 * 365);  // a method takes the time that it takes
}

void HttpServer::Session::Enter(Phase phase) {
  phase_ = phase;
  deadline_ = Clock::now() + LimitOf(phase);
}

void HttpServer::Session::Stop() {
  if (phase_ == Phase::kIdle || phase_ == Phase::kHead || phase_ == Phase::kBody) Close();
}

void HttpServer::Session::Close() {
  Error ignored;
  socket_.close(ignored);
  engine_.Forget(shared_from_this());
}

// Takes what has come so far as far as it goes.
void HttpServer::Session::Advance() {
  while (buffer_.size() > 0) {
    if (phase_ == Phase::kIdle) Enter(Phase::kHead);
    Error error;
    const bool in_head = !parser_->is_header_done();
    const std::size_t taken = parser_->put(buffer_.data(), error);
    buffer_.consume(taken);
    // The parser's own limit is one of each header.
    if (in_head && (head_bytes_ += taken) > engine_.limits().head_bytes) error = http::error::header_limit;
    if (auto& refusal = parser_->get().body().refusal) return Send(*std::move(refusal));
    if (error == http::error::need_more) break;
    if (error) return Send(Malformed(engine_.service(), error));
    if (!begun_ && parser_->is_header_done()) {
      if (auto answer = BeginExchange()) return Send(*std::move(answer));
    }
    if (parser_->is_done()) return Run();
  }
  if (awaits_continue_) return SendContinue();
  Read();
}

// Shows the head to the service. A response is the answer already.
std::optional<Response> HttpServer::Session::BeginExchange() {
  const Request& request = parser_->get();
  if (const char* fault = FramingFault(request)) return engine_.service().Refuse(400, fault);
  begun_ = true;
  const auto expected = request[http::field::expect];
  if (!expected.empty() && !beast::iequals(expected, "100-continue")) {
    return engine_.service().Refuse(417, "Only 100-continue can be expected.");
  }
  auto begun = engine_.service().Begin(MakeHead());
  if (auto* answer = std::get_if<Response>(&begun)) return std::move(*answer);
  parser_->get().body().exchange = std::get<std::shared_ptr<Exchange>>(std::move(begun));
  awaits_continue_ = !expected.empty() && !parser_->is_done();
  Enter(Phase::kBody);
  return std::nullopt;
}

Head HttpServer::Session::MakeHead() const {
  const Request& request = parser_->get();
  Head head;
  head.method = View(request.method_string());
  head.target = View(request.target());
  head.host = Find(request, http::field::host);
  head.origin = Find(request, http::field::origin);
  head.content_type = Find(request, http::field::content_type).value_or("");
  head.has_body = !parser_->is_done();
  head.content_length = parser_->content_length().value_or(0);
  head.over_tcp = over_tcp_;
  return head;
}

void HttpServer::Session::Read() {
  const std::size_t room = engine_.limits().head_bytes + kReadBytes - buffer_.size();
  if (room == 0) return Send(engine_.service().Refuse(400, "A line between the chunks is too long."));
  socket_.async_read_some(
      buffer_.prepare(std::min(room, kReadBytes)),
      [self = shared_from_this()](const Error& error, std::size_t bytes) { self->OnRead(error, bytes); });
}

void HttpServer::Session::OnRead(const Error& error, std::size_t bytes) {
  if (error) return Close();
  if (phase_ == Phase::kDrain) return Drain();
  buffer_.commit(bytes);
  Advance();
}

void HttpServer::Session::SendContinue() {
  static constexpr std::string_view kContinue = "HTTP/1.1 100 Continue\r\n\r\n";
  awaits_continue_ = false;
  asio::async_write(socket_, asio::buffer(kContinue), [self = shared_from_this()](const Error& error, std::size_t) {
    error ? self->Close() : self->Read();
  });
}

void HttpServer::Session::Run() {
  Enter(Phase::kCall);
  const std::shared_ptr<Exchange> exchange = std::move(parser_->get().body().exchange);
  // The session belongs to the network thread, so a worker must never own it, nor be its last owner.
  exchange->Run([weak = weak_from_this(), &io = engine_.io()](Response response) {
    asio::post(io, [weak, response = std::move(response)]() mutable {
      if (const auto self = weak.lock()) self->Send(std::move(response));
    });
  });
}

bool HttpServer::Session::MayGoOn() const {
  return begun_ && parser_->is_done() && parser_->keep_alive() && !engine_.stopping();
}

void HttpServer::Session::Send(Response response) {
  keep_alive_ = MayGoOn();
  Enter(Phase::kWrite);
  auto& message = message_.emplace(static_cast<http::status>(response.status), 11);
  message.set(http::field::date, engine_.date());
  message.set(http::field::content_type, "application/json");
  message.set(http::field::cache_control, "no-store");
  message.set("X-Content-Type-Options", "nosniff");
  for (const auto& [name, value] : response.headers) message.set(name, value);
  message.keep_alive(keep_alive_);
  message.content_length(response.body.size());
  if (parser_->get().method() != http::verb::head) message.body() = std::move(response.body);
  http::async_write(socket_, message,
                    [self = shared_from_this()](const Error& error, std::size_t) { self->OnSent(error); });
}

void HttpServer::Session::OnSent(const Error& error) {
  if (error) return Close();
  if (!keep_alive_) {
    // A connection that is closed with unread bytes in it takes the answer along.
    Enter(Phase::kDrain);
    Error ignored;
    socket_.shutdown(Socket::shutdown_send, ignored);
    return Drain();
  }
  if (engine_.stopping()) return Close();
  NewRequest();
  Enter(Phase::kIdle);
  Advance();
}

void HttpServer::Session::Drain() {
  buffer_.clear();
  Read();
}

HttpServer::Engine::Engine(Service& service, std::vector<Listener> listeners, HttpLimits limits)
    : service_(service), limits_(limits), listeners_(std::move(listeners)) {
  for (Listener& listener : listeners_) Open(listener);
  Accept();
  thread_ = std::thread([this] { io_.run(); });
}

HttpServer::Engine::~Engine() {
  Stop();
  Join();
}

void HttpServer::Engine::Stop() {
  asio::post(io_, [this] { OnStop(); });
}

void HttpServer::Engine::Join() {
  if (thread_.joinable()) thread_.join();
}

void HttpServer::Engine::Open(Listener& listener) {
  auto door = std::make_unique<Door>(Door{Acceptor(io_), listener.family() != AF_UNIX});
  door->acceptor.assign(Protocol(listener.family(), 0), listener.TakeSocket().release());
  doors_.push_back(std::move(door));
}

void HttpServer::Engine::Accept() {
  for (const auto& door : doors_) {
    if (!door->waiting && !stopping_ && sessions_.size() < limits_.connections) AcceptAt(*door);
  }
}

void HttpServer::Engine::AcceptAt(Door& door) {
  door.waiting = true;
  door.acceptor.async_accept(
      [this, &door](const Error& error, Socket socket) { OnAccepted(door, error, std::move(socket)); });
}

void HttpServer::Engine::OnAccepted(Door& door, const Error& error, Socket socket) {
  door.waiting = false;
  if (stopping_) return;
  Tick();
  if (error) {
    // Out of descriptors, most likely: tried again at the next tick.
    syslog(LOG_WARNING, "No connection accepted: %s", error.message().c_str());
    return;
  }
  const auto session = std::make_shared<Session>(*this, std::move(socket), door.over_tcp);
  sessions_.insert(session);
  session->Start();
  Accept();
}

void HttpServer::Engine::Forget(const std::shared_ptr<Session>& session) {
  if (sessions_.erase(session) == 0) return;
  if (stopping_ && sessions_.empty()) Finish();
  Accept();
}

void HttpServer::Engine::OnStop() {
  if (stopping_) return;
  stopping_ = true;
  Error ignored;
  for (const auto& door : doors_) door->acceptor.close(ignored);
  const auto sessions = sessions_;  // they leave while they are told
  for (const auto& session : sessions) session->Stop();
  if (sessions_.empty()) Finish();
}

// Leaves the network thread nothing to wait for.
void HttpServer::Engine::Finish() {
  work_.reset();
  timer_.cancel();
}

// Deadlines are looked at once a second, which costs nothing per request; with nobody there, not at all.
void HttpServer::Engine::Tick() {
  if (ticking_) return;
  ticking_ = true;
  timer_.expires_after(std::chrono::seconds(1));
  timer_.async_wait([this](const Error& /*error*/) { OnTick(); });
}

void HttpServer::Engine::OnTick() {
  ticking_ = false;
  const auto sessions = sessions_;
  for (const auto& session : sessions) {
    if (session->IsOverdue(Clock::now())) session->Close();
  }
  Accept();
  if (!sessions_.empty()) Tick();
}

const std::string& HttpServer::Engine::date() {
  if (const std::time_t now = std::time(nullptr); now != dated_) {
    dated_ = now;
    date_ = HttpDate();
  }
  return date_;
}

HttpServer::HttpServer(Service& service, std::vector<Listener> listeners, HttpLimits limits)
    : engine_(std::make_unique<Engine>(service, std::move(listeners), limits)) {}
HttpServer::~HttpServer() = default;
void HttpServer::Stop() { engine_->Stop(); }
void HttpServer::Join() { engine_->Join(); }

}  // namespace vorn::server
