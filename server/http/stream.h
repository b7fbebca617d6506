// The byte stream of one connection. tls_stream.h has the implementation for connections with TLS.
#ifndef VORN_SERVER_STREAM_H
#define VORN_SERVER_STREAM_H

#include <array>
#include <boost/asio/basic_stream_socket.hpp>
#include <boost/asio/buffer.hpp>
#include <boost/asio/generic/stream_protocol.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/system/error_code.hpp>
#include <cstddef>
#include <functional>

namespace vorn::server {

// Used by the network thread alone. At most one read and one write are under way at a time; each ends with a call of
// its `done` from the event loop, never from within the call that began it.
class Stream {
 public:
  using Error = boost::system::error_code;
  using Done = std::function<void(const Error& error, std::size_t bytes)>;
  using Buffers = std::array<boost::asio::const_buffer, 2>;

  virtual ~Stream() = default;

  // The handshake before the first byte of HTTP; a plain stream has none. `done` may be called immediately.
  // NOLINTNEXTLINE(performance-unnecessary-value-param): a handshake keeps `done`.
  virtual void Begin(Done done) { done({}, 0); }

  // Whether the connection has TLS.
  virtual bool IsSecure() const { return false; }

  virtual void ReadSome(boost::asio::mutable_buffer buffer, Done done) = 0;
  virtual void Write(Buffers buffers, Done done) = 0;  // all of them

  // Tells the peer that nothing more will be sent.
  virtual void FinishSending() = 0;

  // Ends the connection. Operations under way end with an error.
  virtual void Close() = 0;

  // Returns whether the peer has closed its end.
  virtual bool PeerHasLeft() const = 0;
};

using Protocol = boost::asio::generic::stream_protocol;  // Unix and TCP alike
using Socket = boost::asio::basic_stream_socket<Protocol, boost::asio::io_context::executor_type>;

class SocketStream : public Stream {
 public:
  explicit SocketStream(Socket socket) : socket_(std::move(socket)) {}

  void ReadSome(boost::asio::mutable_buffer buffer, Done done) override;
  void Write(Buffers buffers, Done done) override;
  void FinishSending() override;
  void Close() override;
  bool PeerHasLeft() const override;

 private:
  mutable Socket socket_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_STREAM_H
