// A client that sends exactly the bytes that a test wants sent.
#ifndef VORN_TESTS_SERVER_CONNECTION_H
#define VORN_TESTS_SERVER_CONNECTION_H

#include <json/value.h>

#include <map>
#include <string>
#include <string_view>

#include "unique_fd.h"

namespace vorn::server {

struct Reply {
  int status = 0;  // 0: the connection ended before a whole reply
  std::map<std::string, std::string> headers;
  std::string body;

  Json::Value Envelope() const;  // of the body; null if it is no JSON
};

class Connection {
 public:
  static Connection ToUnix(const std::string& path);
  static Connection ToPort(int port);  // of 127.0.0.1

  bool connected() const { return static_cast<bool>(socket_); }
  int socket() const { return socket_.get(); }

  // False when the server has gone.
  bool Send(std::string_view bytes);
  void FinishSending();

  // The next reply; `head_only` for one to a HEAD request.
  Reply Receive(bool head_only = false);

  // Everything until the server closes; "(open)" in its end if it does not.
  std::string ReceiveAll();

  // Whether the server closes the connection without another byte.
  bool IsClosedByServer() { return ReceiveAll().empty(); }

 private:
  explicit Connection(UniqueFd socket) : socket_(std::move(socket)) {}
  bool ReadMore();

  UniqueFd socket_;
  std::string unread_;
};

// A POST of JSON, or of nothing.
std::string Post(const std::string& target, const std::string& json = "", const std::string& more_headers = "");
std::string Get(const std::string& target);

}  // namespace vorn::server

#endif  // VORN_TESTS_SERVER_CONNECTION_H
