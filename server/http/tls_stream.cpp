#include "tls_stream.h"

#include <openssl/bio.h>
#include <openssl/err.h>
#include <openssl/ssl.h>
#include <poll.h>
#include <sys/socket.h>

#include <algorithm>
#include <array>
#include <boost/asio/error.hpp>
#include <boost/asio/post.hpp>
#include <cerrno>
#include <new>
#include <string_view>
#include <utility>

namespace vorn::server {

namespace asio = boost::asio;

namespace {

constexpr std::size_t kRecordBytes = 16384;  // the largest plaintext of a record (RFC 8446, 5.1)

// The bytes that are written before other connections have their turn.
constexpr std::size_t kWrittenAtOnce = 4 * kRecordBytes;
constexpr int kMore = -100;  // not a result of OpenSSL

constexpr std::string_view kUseHttps =
    "HTTP/1.1 400 Bad Request\r\nContent-Type: text/plain\r\nContent-Length: 50\r\nConnection: close\r\n\r\n"
    "This port has TLS. Use a URL that begins https://\n";

}  // namespace

// The functions with which OpenSSL reads and writes the socket of a stream.
struct Wire {
  static TlsStream& StreamOf(BIO* bio) { return *static_cast<TlsStream*>(BIO_get_data(bio)); }

  static bool WouldWait() { return errno == EAGAIN || errno == EINTR; }

  static int Read(BIO* bio, char* data, int size) {
    TlsStream& stream = StreamOf(bio);
    BIO_clear_retry_flags(bio);
    auto room = static_cast<std::size_t>(size);
    if (!stream.begun_) room = std::min(room, stream.handshake_room_);
    if (room == 0) return -1;
    const ssize_t count = recv(stream.socket_.native_handle(), data, room, MSG_DONTWAIT);
    if (count < 0 && WouldWait()) BIO_set_retry_read(bio);
    if (count > 0 && !stream.begun_) stream.handshake_room_ -= static_cast<std::size_t>(count);
    return static_cast<int>(count);
  }

  static int Write(BIO* bio, const char* data, int size) {
    BIO_clear_retry_flags(bio);
    const int socket = StreamOf(bio).socket_.native_handle();
    const ssize_t count = send(socket, data, static_cast<std::size_t>(size), MSG_DONTWAIT | MSG_NOSIGNAL);
    if (count < 0 && WouldWait()) BIO_set_retry_write(bio);
    return static_cast<int>(count);
  }

  static long Control(BIO* /*bio*/, int command, long /*number*/, void* /*data*/) {
    return command == BIO_CTRL_FLUSH ? 1 : 0;
  }

  static const BIO_METHOD* Method() {
    static const BIO_METHOD* const method = [] {
      BIO_METHOD* made = BIO_meth_new(BIO_get_new_index() | BIO_TYPE_SOURCE_SINK, "connection");
      if (made == nullptr) throw std::bad_alloc();
      BIO_meth_set_read(made, Read);
      BIO_meth_set_write(made, Write);
      BIO_meth_set_ctrl(made, Control);
      return made;
    }();
    return method;
  }
};

TlsStream::TlsStream(Socket socket, TlsConnection connection, std::size_t handshake_bytes)
    : socket_(std::move(socket)), connection_(std::move(connection)), handshake_room_(handshake_bytes) {
  BIO* bio = connection_ ? BIO_new(Wire::Method()) : nullptr;
  if (bio == nullptr) throw std::bad_alloc();
  BIO_set_data(bio, this);
  BIO_set_init(bio, 1);
  SSL_set_bio(connection_.get(), bio, bio);
}

void TlsStream::Begin(Done done) { Advance({&TlsStream::Handshake, std::move(done)}, Caller::kUser); }

void TlsStream::ReadSome(asio::mutable_buffer buffer, Done done) {
  Advance({&TlsStream::Read, std::move(done), buffer}, Caller::kUser);
}

// The head of an answer and a small body travel in one record.
void TlsStream::Write(Buffers buffers, Done done) {
  Operation operation{&TlsStream::WriteAll, std::move(done), {}, buffers};
  if (buffers[1].size() > 0 && buffers[0].size() + buffers[1].size() <= kRecordBytes) {
    for (const asio::const_buffer& part : buffers) {
      operation.record.append(static_cast<const char*>(part.data()), part.size());
    }
  }
  writing_ = true;
  Advance(std::move(operation), Caller::kUser);
}

// The peer learns from TLS, and then from TCP, that nothing more will be sent.
void TlsStream::FinishSending() {
  const auto then = [this](const Error& error, std::size_t /*bytes*/) {
    Error ignored;
    if (!error) socket_.shutdown(Socket::shutdown_send, ignored);
  };
  if (begun_ && !failed_) Advance({&TlsStream::Shutdown, then}, Caller::kEventLoop);
}

void TlsStream::Close() {
  const bool ends_in_order = begun_ && !failed_ && !writing_ && SSL_get_shutdown(connection_.get()) == 0;
  if (ends_in_order) (void)SSL_shutdown(connection_.get());
  ERR_clear_error();
  failed_ = true;
  Error ignored;
  socket_.close(ignored);
}

bool TlsStream::PeerHasLeft() const {
  pollfd state{socket_.native_handle(), POLLRDHUP, 0};
  return poll(&state, 1, 0) == 1;
}

int TlsStream::Handshake(Operation* /*operation*/) {
  const int result = SSL_do_handshake(connection_.get());
  begun_ = result == 1;
  return result;
}

int TlsStream::Read(Operation* operation) {
  return SSL_read_ex(connection_.get(), operation->into.data(), operation->into.size(), &operation->bytes);
}

int TlsStream::WriteAll(Operation* operation) {
  const Buffers joined = {asio::buffer(std::as_const(operation->record)), {}};
  const std::size_t before = operation->bytes;
  std::size_t skipped = before;
  for (const asio::const_buffer& part : operation->record.empty() ? operation->from : joined) {
    asio::const_buffer rest = part + std::min(skipped, part.size());
    skipped -= part.size() - rest.size();
    while (rest.size() > 0) {
      if (operation->bytes - before >= kWrittenAtOnce) return kMore;
      std::size_t written = 0;
      const int result = SSL_write_ex(connection_.get(), rest.data(), rest.size(), &written);
      if (result != 1) return result;
      operation->bytes += written;
      rest += written;
    }
  }
  writing_ = false;
  return 1;
}

// SSL_shutdown(3) returns 0 if the peer has not yet closed its side, which is not awaited.
int TlsStream::Shutdown(Operation* /*operation*/) {
  const int result = SSL_shutdown(connection_.get());
  return result == 0 ? 1 : result;
}

void TlsStream::Advance(Operation operation, Caller caller) {
  if (failed_) return Finish(std::move(operation), asio::error::not_connected, caller);
  ERR_clear_error();
  const int result = (this->*operation.step)(&operation);
  if (result == kMore) return Await(Socket::wait_write, std::move(operation));
  const int reason = result > 0 ? SSL_ERROR_NONE : SSL_get_error(connection_.get(), result);
  if (reason == SSL_ERROR_NONE) return Finish(std::move(operation), {}, caller);
  if (reason == SSL_ERROR_WANT_READ) return Await(Socket::wait_read, std::move(operation));
  if (reason == SSL_ERROR_WANT_WRITE) return Await(Socket::wait_write, std::move(operation));
  Finish(std::move(operation), FailureOf(reason), caller);
}

TlsStream::Error TlsStream::FailureOf(int reason) {
  if (reason == SSL_ERROR_ZERO_RETURN) return asio::error::eof;
  failed_ = true;
  if (!begun_ && ERR_GET_REASON(ERR_peek_error()) == SSL_R_HTTP_REQUEST) AnswerPlainHttp();
  ERR_clear_error();
  return asio::error::connection_reset;
}

// The request is read as far as it has arrived: closing a connection with unread bytes resets it, and the client may
// lose the answer.
void TlsStream::AnswerPlainHttp() {
  const int socket = socket_.native_handle();
  (void)send(socket, kUseHttps.data(), kUseHttps.size(), MSG_DONTWAIT | MSG_NOSIGNAL);
  std::array<char, 4096> unread;
  for (int i = 0; i < 4 && recv(socket, unread.data(), unread.size(), MSG_DONTWAIT) > 0; ++i) {
  }
}

// `operation` is a part of the handler, so that it goes with the event loop.
void TlsStream::Await(Socket::wait_type event, Operation operation) {
  socket_.async_wait(event, [this, alive = std::weak_ptr<const bool>(alive_),
                             operation = std::move(operation)](const Error& error) mutable {
    if (alive.expired()) return;  // the end of a connection is not awaited by its session
    error ? operation.done(error, 0) : Advance(std::move(operation), Caller::kEventLoop);
  });
}

void TlsStream::Finish(Operation operation, const Error& error, Caller caller) {
  if (caller == Caller::kEventLoop) return operation.done(error, operation.bytes);
  asio::post(socket_.get_executor(),
             [error, operation = std::move(operation)] { operation.done(error, operation.bytes); });
}

}  // namespace vorn::server
