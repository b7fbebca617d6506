// A client that sends exactly the given bytes.
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

  // Returns false if the server has closed the connection.
  bool Send(std::string_view bytes);
  void FinishSending();

  // Receives the next reply. `head_only` is for the reply to a HEAD request.
  Reply Receive(bool head_only = false);

  // Receives everything until the server closes; appends "(open)" if it does not close.
  std::string ReceiveAll();

  // Returns whether the server closes the connection without sending another byte.
  bool IsClosedByServer() { return ReceiveAll().empty(); }

 private:
  explicit Connection(UniqueFd socket) : socket_(std::move(socket)) {}
  bool ReadMore();

  UniqueFd socket_;
  std::string unread_;
};

// Returns a POST request with a JSON body, or without a body.
std::string Post(const std::string& target, const std::string& json = "", const std::string& more_headers = "");
std::string Get(const std::string& target, const std::string& more_headers = "");

// "Authorization: Bearer ...", with its line break.
std::string BearerHeader(const std::string& token);

}  // namespace vorn::server

#endif  // VORN_TESTS_SERVER_CONNECTION_H
