#include "stream.h"

#include <poll.h>

#include <boost/asio/write.hpp>
#include <utility>

namespace vorn::server {

void SocketStream::ReadSome(boost::asio::mutable_buffer buffer, Done done) {
  socket_.async_read_some(buffer, std::move(done));
}

void SocketStream::Write(Buffers buffers, Done done) { boost::asio::async_write(socket_, buffers, std::move(done)); }

void SocketStream::FinishSending() {
  Error ignored;
  socket_.shutdown(Socket::shutdown_send, ignored);
}

void SocketStream::Close() {
  Error ignored;
  socket_.close(ignored);
}

bool SocketStream::PeerHasLeft() const {
  pollfd state{socket_.native_handle(), POLLRDHUP, 0};
  return poll(&state, 1, 0) == 1;
}

}  // namespace vorn::server
