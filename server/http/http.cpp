#include "http.h"

#include <pthread.h>
#include <sys/socket.h>
#include <syslog.h>

#include <algorithm>
#include <atomic>
#include <boost/asio/basic_socket_acceptor.hpp>
#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/posix/basic_stream_descriptor.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/steady_timer.hpp>
#include <cerrno>
#include <cstring>
#include <ctime>
#include <exception>
#include <future>
#include <new>
#include <thread>
#include <unordered_set>
#include <utility>

#include "session.h"
#include "tls_stream.h"

namespace vorn::server {
namespace {

namespace asio = boost::asio;

using Clock = std::chrono::steady_clock;
using Error = boost::system::error_code;
using Executor = asio::io_context::executor_type;
using Acceptor = asio::basic_socket_acceptor<Protocol, Executor>;

// Descriptors reserved for other uses than connections: modules, workers and their files, the journal, the bus, and one
// for accept(2).
constexpr rlim_t kReservedDescriptors = 192;
constexpr std::size_t kFewestConnections = 8;  // of a listener

// The number of connections that are accepted before other events are handled. While many clients send
// large requests, one round of the event loop reads up to 128 pieces of 8 KiB. If each round accepted only a few
// connections, a new client would wait behind many others.
constexpr int kAcceptedAtOnce = 32;

bool IsExhaustion(int error) { return error == EMFILE || error == ENFILE || error == ENOBUFS || error == ENOMEM; }

}  // namespace

HttpLimits FitToDescriptors(HttpLimits limits, const std::vector<Listener>& listeners, rlim_t descriptors) {
  std::size_t wanted = 0;
  for (const Listener& listener : listeners) {
    wanted += (listener.family() == AF_UNIX ? limits.unix_connections : limits.tcp_connections).total;
  }
  const rlim_t room = descriptors > kReservedDescriptors ? descriptors - kReservedDescriptors : 0;
  if (wanted <= room) return limits;
  for (ConnectionShare* share : {&limits.tcp_connections, &limits.unix_connections}) {
    share->total = std::max<std::size_t>(kFewestConnections, share->total * room / wanted);
    share->per_address = std::min(share->per_address, share->total);
  }
  return limits;
}

rlim_t DescriptorLimit() {
  rlimit limit{};
  return getrlimit(RLIMIT_NOFILE, &limit) == 0 ? limit.rlim_cur : FOPEN_MAX;
}

// All sessions, the listening sockets, and the timer of the deadlines. Everything but the constructor, the
// destructor, Stop and the joins runs on the network thread.
//
// No function of this class that is called for many sessions allocates memory, and no operation of Asio has a result
// that would be lost if there is no memory for it (as async_accept would lose a connection and its handler).
class HttpServer::Engine : public SessionHost {
 public:
  Engine(Service& service, std::vector<Listener> listeners, HttpLimits limits, HttpParts parts);
  ~Engine() override;

  void Stop();
  void Join();
  bool JoinFor(std::chrono::milliseconds limit);

  Service& service() override { return service_; }
  const HttpLimits& limits() const override { return limits_; }
  Budget* bodies() override { return parts_.bodies; }
  AccessLog* log() override { return parts_.log; }
  const std::shared_ptr<Mailbox>& mailbox() override { return mailbox_; }
  bool stopping() const override { return stopping_; }
  const std::string& date() override;
  std::string strict_transport() const override { return parts_.tls == nullptr ? "" : parts_.tls->strict_transport(); }
  void DispatchLater() override;
  void Forget(const std::shared_ptr<Session>& session) override;

 private:
  struct Door {
    Acceptor acceptor;
    ConnectionShare share;
    bool waiting = false;  // for a connection
  };

  void Open(Listener& listener);
  void Serve();
  void Arm();
  void AwaitConnections(std::size_t listener);
  void Accept(std::size_t listener);
  void Admit(std::size_t listener, UniqueFd connection);
  std::shared_ptr<Session> NewSession(std::size_t listener, UniqueFd connection);
  std::unique_ptr<Stream> NewStream(std::size_t listener, Socket socket) const;
  void KeepToShare(const std::shared_ptr<Session>& newest);
  bool MakeRoom(int error);
  template <typename Step>
  void ForEachSession(const Step& step);
  void ReadMailbox();
  void OnWake();
  void StartTimer();
  void OnTick();
  void OnStop();
  void Finish();

  Service& service_;
  const HttpLimits limits_;
  const HttpParts parts_;
  std::vector<Listener> listeners_;  // kept for the files of Unix sockets
  const std::shared_ptr<Mailbox> mailbox_ = std::make_shared<Mailbox>();
  asio::io_context io_{1};  // one thread runs it
  asio::executor_work_guard<Executor> work_{io_.get_executor()};
  asio::basic_waitable_timer<Clock, asio::wait_traits<Clock>, Executor> timer_{io_};
  asio::posix::basic_stream_descriptor<Executor> letters_{io_, dup(mailbox_->descriptor())};
  std::uint64_t letter_count_ = 0;
  bool reading_letters_ = false;
  bool ticking_ = false;
  bool dispatching_ = false;
  bool stopping_ = false;
  std::atomic<bool> stop_wanted_{false};
  std::atomic<bool> end_wanted_{false};
  std::vector<std::unique_ptr<Door>> doors_;
  std::unordered_set<std::shared_ptr<Session>> sessions_;
  Clock::time_point warned_;  // of a lack of descriptors
  std::time_t dated_ = 0;
  std::string date_;
  std::promise<void> ended_;
  std::future<void> end_ = ended_.get_future();
  std::thread thread_;
};

HttpServer::Engine::Engine(Service& service, std::vector<Listener> listeners, HttpLimits limits, HttpParts parts)
    : service_(service), limits_(limits), parts_(parts), listeners_(std::move(listeners)) {
  for (Listener& listener : listeners_) Open(listener);
  thread_ = std::thread([this] { Serve(); });
}

HttpServer::Engine::~Engine() {
  end_wanted_ = true;
  Stop();
  Join();
}

void HttpServer::Engine::Stop() {
  stop_wanted_ = true;
  mailbox_->Wake();
}

void HttpServer::Engine::Join() {
  if (thread_.joinable()) thread_.join();
}

bool HttpServer::Engine::JoinFor(std::chrono::milliseconds limit) {
  if (end_.wait_for(limit) != std::future_status::ready) return false;
  Join();
  return true;
}

void HttpServer::Engine::Open(Listener& listener) {
  const bool local = listener.family() == AF_UNIX;
  auto door = std::make_unique<Door>(Door{Acceptor(io_), local ? limits_.unix_connections : limits_.tcp_connections});
  door->acceptor.assign(Protocol(listener.family(), 0), listener.TakeSocket().release());
  doors_.push_back(std::move(door));
}

// After std::bad_alloc an operation may not have been started, so all are started again.
void HttpServer::Engine::Serve() {
  pthread_setname_np(pthread_self(), "network");
  for (;;) {
    try {
      Arm();
      io_.run();
      break;
    } catch (const std::exception& exception) {
      syslog(LOG_ERR, "The network thread goes on after an exception: %s", exception.what());
      std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
  }
  ended_.set_value();
}

void HttpServer::Engine::Arm() {
  if (stopping_ && sessions_.empty()) return Finish();
  ReadMailbox();
  for (std::size_t i = 0; i < doors_.size(); ++i) AwaitConnections(i);
  if (!sessions_.empty()) StartTimer();
}

void HttpServer::Engine::AwaitConnections(std::size_t listener) {
  Door& door = *doors_[listener];
  if (door.waiting || stopping_) return;
  door.acceptor.async_wait(Acceptor::wait_read, [this, listener](const Error& /*error*/) {
    doors_[listener]->waiting = false;
    if (!stopping_) Accept(listener);
  });
  door.waiting = true;
}

void HttpServer::Engine::Accept(std::size_t listener) {
  StartTimer();
  const int acceptor = doors_[listener]->acceptor.native_handle();
  for (int i = 0; i < kAcceptedAtOnce; ++i) {
    UniqueFd connection(accept4(acceptor, nullptr, nullptr, SOCK_CLOEXEC));
    if (!connection && errno == EAGAIN) break;
    if (!connection && !MakeRoom(errno)) return;  // until the next tick
    if (connection) Admit(listener, std::move(connection));
  }
  AwaitConnections(listener);
}

void HttpServer::Engine::Admit(std::size_t listener, UniqueFd connection) {
  std::shared_ptr<Session> session;
  try {
    session = NewSession(listener, std::move(connection));
    session->Start();
    KeepToShare(session);
  } catch (const std::exception& exception) {
    syslog(LOG_ERR, "A new connection ends: %s", exception.what());
    if (session) session->Close();
  }
}

std::shared_ptr<Session> HttpServer::Engine::NewSession(std::size_t listener, UniqueFd connection) {
  Peer peer = PeerOf(connection.get());
  Socket socket(io_.get_executor());
  socket.assign(Protocol(listeners_[listener].family(), 0), connection.get());
  (void)connection.release();
  auto session = std::make_shared<Session>(*this, NewStream(listener, std::move(socket)), std::move(peer), listener);
  sessions_.insert(session);
  return session;
}

// A handshake may be as long as the headers of a request.
std::unique_ptr<Stream> HttpServer::Engine::NewStream(std::size_t listener, Socket socket) const {
  if (!listeners_[listener].tls()) return std::make_unique<SocketStream>(std::move(socket));
  return std::make_unique<TlsStream>(std::move(socket), parts_.tls->identity()->NewConnection(), limits_.head_bytes);
}

void HttpServer::Engine::KeepToShare(const std::shared_ptr<Session>& newest) {
  const ConnectionShare& share = doors_[newest->listener()]->share;
  if (sessions_.size() <= std::min(share.total, share.per_address)) return;
  std::vector<std::shared_ptr<Session>> sessions;
  std::vector<ConnectionUse> uses;
  sessions.reserve(sessions_.size());
  uses.reserve(sessions_.size());
  const auto now = Clock::now();
  const auto add = [&](const std::shared_ptr<Session>& session) {
    sessions.push_back(session);
    uses.push_back(session->UseAt(now));
  };
  for (const auto& session : sessions_) {
    if (session != newest && session->listener() == newest->listener()) add(session);
  }
  add(newest);
  const std::size_t surplus = SurplusOf(uses, share);
  if (surplus == kNoConnection) return;
  const bool is_needed = uses[surplus].activity == Activity::kWaiting;
  if (is_needed && CallsCrowdOut(uses, share) && service_.EndWaitingCall()) return;
  sessions[surplus] == newest ? newest->TurnAway() : sessions[surplus]->Close();
}

// Called after accept(2) has failed. Without a descriptor for the new connection, the most expendable one makes room.
// Returns false if another attempt is useless before the next tick.
bool HttpServer::Engine::MakeRoom(int error) {
  if (error == ECONNABORTED || error == EINTR) return true;
  if (const auto now = Clock::now(); now - warned_ > std::chrono::minutes(1)) {
    warned_ = now;
    syslog(LOG_WARNING, "No connection accepted: %s", std::strerror(error));
  }
  if (!IsExhaustion(error)) return false;
  const std::vector<std::shared_ptr<Session>> sessions(sessions_.begin(), sessions_.end());
  std::vector<ConnectionUse> uses;
  uses.reserve(sessions.size());
  for (const auto& session : sessions) uses.push_back(session->UseAt(Clock::now()));
  const std::size_t chosen = MostExpendable(uses);
  if (chosen == kNoConnection) return false;
  sessions[chosen]->Close();
  return true;
}

// `step` may remove the session that it is called with.
template <typename Step>
void HttpServer::Engine::ForEachSession(const Step& step) {
  for (auto next = sessions_.begin(); next != sessions_.end();) {
    const std::shared_ptr<Session> session = *next++;
    step(*session);
  }
}

void HttpServer::Engine::Forget(const std::shared_ptr<Session>& session) {
  if (sessions_.erase(session) == 0) return;
  if (stopping_ && sessions_.empty()) Finish();
}

void HttpServer::Engine::ReadMailbox() {
  if (reading_letters_) return;
  letters_.async_read_some(asio::buffer(&letter_count_, sizeof letter_count_),
                           [this](const Error& error, std::size_t /*bytes*/) {
                             reading_letters_ = false;
                             if (error) return;
                             mailbox_->Deliver();
                             OnWake();
                             if (!stopping_ || !sessions_.empty()) ReadMailbox();
                           });
  reading_letters_ = true;
}

void HttpServer::Engine::OnWake() {
  if (stop_wanted_) OnStop();
  if (end_wanted_) ForEachSession([](Session& session) { session.Close(); });
}

// Checks the deadlines once a second while there are connections.
void HttpServer::Engine::StartTimer() {
  if (ticking_) return;
  timer_.expires_after(std::chrono::seconds(1));
  timer_.async_wait([this](const Error& /*error*/) { OnTick(); });
  ticking_ = true;
}

void HttpServer::Engine::OnTick() {
  ticking_ = false;
  const auto now = Clock::now();
  ForEachSession([now](Session& session) { session.Tick(now); });
  for (std::size_t i = 0; i < doors_.size(); ++i) AwaitConnections(i);
  if (!sessions_.empty()) StartTimer();
}

void HttpServer::Engine::OnStop() {
  if (stopping_) return;
  stopping_ = true;
  Error ignored;
  for (const auto& door : doors_) door->acceptor.close(ignored);
  ForEachSession([](Session& session) { session.Stop(); });
  if (sessions_.empty()) Finish();
}

// Cancels everything that the network thread waits for, so that it ends.
void HttpServer::Engine::Finish() {
  Error ignored;
  work_.reset();
  timer_.cancel();
  letters_.close(ignored);
}

const std::string& HttpServer::Engine::date() {
  if (const std::time_t now = std::time(nullptr); now != dated_) {
    dated_ = now;
    date_ = HttpDate();
  }
  return date_;
}

// Asio runs a posted handler after those whose events it has already taken from the kernel.
void HttpServer::Engine::DispatchLater() {
  if (dispatching_) return;
  try {
    asio::post(io_, [this] {
      dispatching_ = false;
      service_.Dispatch();
    });
    dispatching_ = true;
  } catch (const std::bad_alloc&) {
    service_.Dispatch();
  }
}

HttpServer::HttpServer(Service& service, std::vector<Listener> listeners, HttpLimits limits, HttpParts parts)
    : engine_(std::make_unique<Engine>(service, std::move(listeners), limits, parts)) {}
HttpServer::~HttpServer() = default;
void HttpServer::Stop() { engine_->Stop(); }
void HttpServer::Join() { engine_->Join(); }
bool HttpServer::JoinFor(std::chrono::milliseconds limit) { return engine_->JoinFor(limit); }

}  // namespace vorn::server
