// The answers of the real vornd to malformed requests, and to requests that two parsers could frame differently.
#include <gtest/gtest.h>

#include <csignal>
#include <memory>

#include "server_process.h"

namespace vorn::server {
namespace {

class Framing : public testing::Test {
 protected:
  static void SetUpTestSuite() {
    sandbox_ = std::make_unique<Sandbox>();
    server_ = std::make_unique<ServerProcess>(*sandbox_);
  }
  static void TearDownTestSuite() {
    server_->Signal(SIGTERM);
    EXPECT_EQ(server_->Wait(), 0) << server_->log();
    server_.reset();
    sandbox_.reset();
  }
  static std::unique_ptr<Sandbox> sandbox_;
  static std::unique_ptr<ServerProcess> server_;
};

std::unique_ptr<Sandbox> Framing::sandbox_;
std::unique_ptr<ServerProcess> Framing::server_;

const std::string kEcho = "POST /api/Test.Echo/v1/get HTTP/1.1\r\n" + ServerProcess::TokenHeader();
const std::string kHost = "Host: localhost\r\n";
const std::string kJson = "Content-Type: application/json\r\n";
const std::string kHidden = "POST /api/Test.Echo/v1/fail HTTP/1.1\r\nHost: localhost\r\n\r\n";

TEST_F(Framing, AmbiguousOrMalformedRequestsAreRefusedAndNothingBehindThemIsRead) {
  const struct {
    const char* name;
    std::string request;
    int status;
  } cases[] = {
      {"length and chunked", kEcho + kHost + kJson + "Content-Length: 2\r\nTransfer-Encoding: chunked\r\n\r\n0\r\n\r\n",
       400},
      {"chunked and length", kEcho + kHost + kJson + "Transfer-Encoding: chunked\r\nContent-Length: 2\r\n\r\n0\r\n\r\n",
       400},
      {"two lengths", kEcho + kHost + kJson + "Content-Length: 2\r\nContent-Length: 3\r\n\r\n{} ", 400},
      {"the same length twice", kEcho + kHost + kJson + "Content-Length: 2\r\nContent-Length: 2\r\n\r\n{}", 400},
      {"negative length", kEcho + kHost + kJson + "Content-Length: -2\r\n\r\n{}", 400},
      {"signed length", kEcho + kHost + kJson + "Content-Length: +2\r\n\r\n{}", 400},
      {"huge length", kEcho + kHost + kJson + "Content-Length: 99999999999999999999\r\n\r\n{}", 400},
      {"two encodings",
       kEcho + kHost + kJson + "Transfer-Encoding: gzip\r\nTransfer-Encoding: chunked\r\n\r\n0\r\n\r\n", 501},
      {"encodings in a list", kEcho + kHost + kJson + "Transfer-Encoding: gzip, chunked\r\n\r\n0\r\n\r\n", 501},
      {"unknown encoding", kEcho + kHost + kJson + "Transfer-Encoding: xchunked\r\n\r\n0\r\n\r\n", 501},
      {"encoding in HTTP/1.0",
       "POST /api/Test.Echo/v1/get HTTP/1.0\r\n" + kJson + "Transfer-Encoding: chunked\r\n\r\n0\r\n\r\n", 400},
      {"two hosts", kEcho + kHost + kHost + "\r\n", 400},
      {"no host", kEcho + "\r\n", 400},
      {"blank before the colon", kEcho + "Host : localhost\r\n\r\n", 400},
      {"line break alone", kEcho + "Host: localhost\nContent-Length: 0\n\n", 400},
      {"folded header without a name", kEcho + ": x\r\n\r\n", 400},
      {"wrong version", "POST /api/Test.Echo/v1/get HTTP/2.0\r\n" + kHost + "\r\n", 400},
      {"no HTTP at all", "hello\r\n\r\n", 400},
      {"bad chunk", kEcho + kHost + kJson + "Transfer-Encoding: chunked\r\n\r\nzz\r\n", 400},
      {"chunk beyond its size", kEcho + kHost + kJson + "Transfer-Encoding: chunked\r\n\r\n1\r\n{}\r\n0\r\n\r\n", 400},
      {"endless chunk extension",
       kEcho + kHost + kJson + "Transfer-Encoding: chunked\r\n\r\n1;" + std::string(100000, 'x'), 400},
      {"large header", kEcho + kHost + "X: " + std::string(17000, 'x') + "\r\n\r\n", 431},
      {"many headers",
       kEcho + kHost +
           [] {
             std::string headers;
             for (int i = 0; i < 4000; ++i) headers += "X: y\r\n";
             return headers;
           }(),
       431},
      {"endless target", "POST /" + std::string(20000, 'x'), 431},
      {"large body", kEcho + kHost + kJson + "Content-Length: 1048577\r\n\r\n", 413},
  };
  for (const auto& c : cases) {
    Connection client = server_->ConnectTcp();
    client.Send(c.request + kHidden);
    client.FinishSending();
    const Reply reply = client.Receive();
    EXPECT_EQ(reply.status, c.status) << c.name << ": " << reply.body;
    EXPECT_EQ(reply.Envelope()["error"]["code"], c.status) << c.name;
    EXPECT_EQ(client.ReceiveAll(), "") << c.name;
  }
}

TEST_F(Framing, ALargeChunkedBodyIsRefusedOnItsWay) {
  Connection client = server_->ConnectTcp();
  client.Send(kEcho + kHost + kJson + "Transfer-Encoding: chunked\r\n\r\n");
  const std::string chunk = "10000\r\n" + std::string(65536, ' ') + "\r\n";
  for (int i = 0; i < 17; ++i) client.Send(chunk);
  EXPECT_EQ(client.Receive().status, 413);
}

TEST_F(Framing, ABodyOfTheLargestSizeIsTaken) {
  Connection client = server_->Connect();
  const std::string json = R"({"a":")" + std::string(1024 * 1024 - 8, 'x') + "\"}";
  client.Send(Post("/api/Test.Echo/v1/get", json));
  const Reply reply = client.Receive();
  EXPECT_EQ(reply.status, 200);
  EXPECT_EQ(reply.Envelope()["data"]["a"].asString().size(), json.size() - 8);
}

TEST_F(Framing, RequestsForPagesOfOtherSitesAreRefused) {
  const struct {
    const char* headers;
    int status;
  } cases[] = {
      {"Host: localhost\r\n", 200},
      {"Host: evil.example\r\n", 421},
      {"Host: localhost.evil.example\r\n", 421},
      {"Host: localhost\r\nOrigin: http://evil.example\r\n", 403},
      {"Host: localhost\r\nOrigin: null\r\n", 403},
      {"Host: localhost\r\nOrigin: http://localhost:1234\r\n", 403},
      {"Host: localhost:1234\r\nOrigin: http://localhost:1234\r\n", 200},
      {"Host: localhost\r\nSec-Fetch-Site: same-origin\r\n", 200},
      {"Host: localhost\r\nSec-Fetch-Site: cross-site\r\n", 403},
      {"Host: localhost\r\nSec-Fetch-Site: same-site\r\n", 403},
  };
  for (const auto& c : cases) {
    Connection client = server_->ConnectTcp();
    client.Send(kEcho + c.headers + "\r\n");
    EXPECT_EQ(client.Receive().status, c.status) << c.headers;
  }
}

TEST_F(Framing, HttpOneZeroWithoutAHostIsNoLoopbackNameEither) {
  Connection client = server_->ConnectTcp();
  client.Send("POST /api/Test.Echo/v1/get HTTP/1.0\r\n\r\n");
  EXPECT_EQ(client.Receive().status, 421);
}

TEST_F(Framing, AFormCannotReachAMethod) {
  for (const char* type : {"application/x-www-form-urlencoded", "text/plain"}) {
    Connection client = server_->ConnectTcp();
    client.Send(kEcho + kHost + "Content-Type: " + type + "\r\nContent-Length: 2\r\n\r\n{}");
    EXPECT_EQ(client.Receive().status, 415) << type;
  }
}

}  // namespace
}  // namespace vorn::server
