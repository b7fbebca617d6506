// The byte stream of one connection with TLS.
#ifndef VORN_SERVER_TLS_STREAM_H
#define VORN_SERVER_TLS_STREAM_H

#include <cstddef>
#include <memory>
#include <string>

#include "stream.h"
#include "tls.h"

namespace vorn::server {

// OpenSSL reads and writes the socket through functions of this class (BIO_meth_new(3)), which do not wait; an
// operation that would have to wait is tried again when the socket is ready.
//
// A request of plain HTTP is answered with 400 and a sentence before the handshake fails.
class TlsStream : public Stream {
 public:
  // The handshake fails if the client has sent `handshake_bytes` before its end.
  TlsStream(Socket socket, TlsConnection connection, std::size_t handshake_bytes);

  void Begin(Done done) override;
  bool IsSecure() const override { return true; }
  void ReadSome(boost::asio::mutable_buffer buffer, Done done) override;
  void Write(Buffers buffers, Done done) override;
  void FinishSending() override;
  void Close() override;
  bool PeerHasLeft() const override;

 private:
  friend struct Wire;  // the functions that OpenSSL calls

  struct Operation {
    int (TlsStream::*step)(Operation* operation);  // returns what SSL_get_error(3) takes, or kMore; > 0: it is done
    Done done;
    boost::asio::mutable_buffer into{};
    Buffers from{};
    std::string record{};   // both buffers of `from`, if they fit into one record
    std::size_t bytes = 0;  // read or written
  };
  enum class Caller { kUser, kEventLoop };

  int Handshake(Operation* operation);
  int Read(Operation* operation);
  int WriteAll(Operation* operation);
  int Shutdown(Operation* operation);

  void Advance(Operation operation, Caller caller);
  void Await(Socket::wait_type event, Operation operation);
  void Finish(Operation operation, const Error& error, Caller caller);
  Error FailureOf(int reason);
  void AnswerPlainHttp();

  mutable Socket socket_;
  const TlsConnection connection_;
  std::size_t handshake_room_;  // in bytes
  bool begun_ = false;          // the handshake is complete
  bool failed_ = false;         // OpenSSL must not be called again
  bool writing_ = false;
  const std::shared_ptr<const bool> alive_ = std::make_shared<const bool>(true);  // expires with this
};

}  // namespace vorn::server

#endif  // VORN_SERVER_TLS_STREAM_H
