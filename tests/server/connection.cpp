#include "connection.h"

#include <arpa/inet.h>
#include <json/reader.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <cstdlib>
#include <memory>
#include <sstream>
#include <utility>

#include "sandbox.h"

namespace vorn::server {
namespace {

template <typename Address>
UniqueFd ConnectTo(const Address& address, int family) {
  UniqueFd socket(::socket(family, SOCK_STREAM | SOCK_CLOEXEC, 0));
  if (connect(socket.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) return {};
  return socket;
}

Reply ParseHead(const std::string& head) {
  Reply reply;
  std::istringstream lines(head);
  std::string line;
  std::getline(lines, line);
  if (line.compare(0, 9, "HTTP/1.1 ") == 0) reply.status = std::atoi(line.c_str() + 9);
  while (std::getline(lines, line) && line != "\r") {
    const std::size_t colon = line.find(": ");
    if (colon != std::string::npos)
      reply.headers[line.substr(0, colon)] = line.substr(colon + 2, line.size() - colon - 3);
  }
  return reply;
}

}  // namespace

Json::Value Reply::Envelope() const {
  Json::Value value;
  const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  return reader->parse(body.data(), body.data() + body.size(), &value, nullptr) ? value : Json::Value();
}

Connection Connection::ToUnix(const std::string& path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  path.copy(address.sun_path, sizeof address.sun_path - 1);
  return Connection(ConnectTo(address, AF_UNIX));
}

Connection Connection::ToPort(int port) {
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<in_port_t>(port));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  return Connection(ConnectTo(address, AF_INET));
}

bool Connection::Send(std::string_view bytes) {
  while (!bytes.empty()) {
    const ssize_t sent = send(socket_.get(), bytes.data(), bytes.size(), MSG_NOSIGNAL);
    if (sent < 0) return false;
    bytes.remove_prefix(static_cast<std::size_t>(sent));
  }
  return true;
}

void Connection::FinishSending() { shutdown(socket_.get(), SHUT_WR); }

bool Connection::ReadMore() {
  pollfd readable{socket_.get(), POLLIN, 0};
  char bytes[65536];
  const auto limit = std::chrono::duration_cast<std::chrono::milliseconds>(kGenerous);
  if (poll(&readable, 1, static_cast<int>(limit.count())) != 1) {
    unread_ += "(open)";
    return false;
  }
  const ssize_t count = recv(socket_.get(), bytes, sizeof bytes, 0);
  if (count > 0) unread_.append(bytes, static_cast<std::size_t>(count));
  return count > 0;
}

Reply Connection::Receive(bool head_only) {
  std::size_t end = 0;
  while ((end = unread_.find("\r\n\r\n")) == std::string::npos) {
    if (!ReadMore()) return {};
  }
  Reply reply = ParseHead(unread_.substr(0, end + 4));
  unread_.erase(0, end + 4);
  const auto length = head_only ? 0 : std::strtoul(reply.headers["Content-Length"].c_str(), nullptr, 10);
  while (unread_.size() < length) {
    if (!ReadMore()) return {};
  }
  reply.body = unread_.substr(0, length);
  unread_.erase(0, length);
  return reply;
}

std::string Connection::ReceiveAll() {
  while (ReadMore()) {
  }
  return std::exchange(unread_, {});
}

std::string Post(const std::string& target, const std::string& json, const std::string& more_headers) {
  const std::string type = json.empty() ? "" : "Content-Type: application/json\r\n";
  return "POST " + target + " HTTP/1.1\r\nHost: localhost\r\n" + type + more_headers +
         "Content-Length: " + std::to_string(json.size()) + "\r\n\r\n" + json;
}

std::string Get(const std::string& target, const std::string& more_headers) {
  return "GET " + target + " HTTP/1.1\r\nHost: localhost\r\n" + more_headers + "\r\n";
}

std::string BearerHeader(const std::string& token) { return "Authorization: Bearer " + token + "\r\n"; }

}  // namespace vorn::server
