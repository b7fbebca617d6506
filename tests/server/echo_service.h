// A service for tests of the transport, and a server that uses it.
#ifndef VORN_TESTS_SERVER_ECHO_SERVICE_H
#define VORN_TESTS_SERVER_ECHO_SERVICE_H

#include <gtest/gtest.h>

#include <cstddef>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "connection.h"
#include "http.h"
#include "sandbox.h"

namespace vorn::server {

// Answers a request with its body, from another thread. Other targets:
//   /no      is refused with 404 after its head
//   /hold    waits for the test to answer
//   /ask     waits for the test to authorise it, and then echoes
//   /fixed   is answered with the response that the test has set
// A body with "stop" in it is refused with 413 as soon as that arrives. Thread-safe.
class EchoService : public Service {
 public:
  // A copy of a head's contents, which outlives the head.
  struct Seen {
    std::string target;
    std::string query;
    std::string host;
    Peer peer;
    unsigned recent_requests = 0;
    std::map<std::string, std::string> headers;
  };

  ~EchoService() override;
  std::variant<std::shared_ptr<Exchange>, Response> Begin(const Head& head) override;
  Response Refuse(int status, std::string_view text) const override { return {status, std::string(text)}; }

  int heads();
  int abandoned();
  std::size_t largest_piece();  // of any body
  Seen last();
  void SetFixed(Response response);

  // Waits until a request is held, and returns its answer function.
  Answer AwaitHeld();
  Proceed AwaitAsked();

 private:
  class Echo;

  std::mutex mutex_;
  int heads_ = 0;
  int abandoned_ = 0;
  std::size_t largest_piece_ = 0;
  Seen last_;
  Response fixed_;
  std::vector<Answer> held_;
  std::vector<Proceed> asked_;
  std::vector<std::thread> threads_;
};

class HttpTest : public testing::Test {
 protected:
  void Start(const HttpLimits& limits = {}, const HttpParts& parts = {});
  Connection Connect() const { return Connection::ToUnix(path_); }
  Connection ConnectTcp() const { return Connection::ToPort(port_); }

  Sandbox sandbox_;
  const std::string path_ = sandbox_.File("socket");
  int port_ = 0;
  EchoService service_;
  std::unique_ptr<HttpServer> server_;
};

}  // namespace vorn::server

#endif  // VORN_TESTS_SERVER_ECHO_SERVICE_H
