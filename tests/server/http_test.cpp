#include "http.h"

#include <gmock/gmock.h>

#include <mutex>
#include <thread>

#include "connection.h"
#include "sandbox.h"

namespace vorn::server {
namespace {

using testing::HasSubstr;

// Answers with the body it was sent, from another thread; "/no" is refused at its head, a body
// with "stop" in it where that arrives.
class EchoService : public Service {
 public:
  class Echo : public Exchange {
   public:
    explicit Echo(std::vector<std::thread>& threads) : threads_(threads) {}
    std::optional<Response> Receive(std::string_view piece) override {
      body_ += piece;
      if (body_.find("stop") != std::string::npos) return Response{413, "stopped", {}};
      return std::nullopt;
    }
    void Run(Answer answer) override {
      threads_.emplace_back([body = body_, answer] { answer({200, body, {{"Extra", "yes"}}}); });
    }

   private:
    std::vector<std::thread>& threads_;
    std::string body_;
  };

  ~EchoService() override {
    for (std::thread& thread : threads_) thread.join();
  }
  std::variant<std::shared_ptr<Exchange>, Response> Begin(const Head& head) override {
    const std::lock_guard<std::mutex> lock(mutex_);
    ++heads_;
    if (head.target == "/no") return Response{404, "refused", {}};
    return std::make_shared<Echo>(threads_);
  }
  Response Refuse(int status, std::string_view text) const override { return {status, std::string(text), {}}; }
  int heads() {
    const std::lock_guard<std::mutex> lock(mutex_);
    return heads_;
  }

 private:
  std::mutex mutex_;
  int heads_ = 0;
  std::vector<std::thread> threads_;  // touched by the network thread, and after its end
};

class HttpTest : public testing::Test {
 protected:
  void Start(const HttpLimits& limits = {}) {
    std::string error;
    std::vector<Listener> listeners;
    listeners.push_back(*OpenListener("unix:" + path_, false, &error));
    server_ = std::make_unique<HttpServer>(service_, std::move(listeners), limits);
  }
  Connection Connect() const { return Connection::ToUnix(path_); }

  Sandbox sandbox_;
  const std::string path_ = sandbox_.File("socket");
  EchoService service_;
  std::unique_ptr<HttpServer> server_;
};

TEST_F(HttpTest, AnswersWithTheHeadersOfEveryAnswer) {
  Start();
  Connection client = Connect();
  client.Send(Post("/echo", "{}"));
  Reply reply = client.Receive();
  EXPECT_EQ(reply.status, 200);
  EXPECT_EQ(reply.body, "{}");
  EXPECT_EQ(reply.headers["Content-Type"], "application/json");
  EXPECT_EQ(reply.headers["Cache-Control"], "no-store");
  EXPECT_EQ(reply.headers["X-Content-Type-Options"], "nosniff");
  EXPECT_EQ(reply.headers["Extra"], "yes");
  EXPECT_THAT(reply.headers["Date"], testing::MatchesRegex("[A-Z][a-z]+, .* GMT"));
}

TEST_F(HttpTest, ARequestMayComeByteByByte) {
  Start();
  Connection client = Connect();
  for (const char c : Post("/echo", "{\"a\": 1}")) client.Send(std::string(1, c));
  EXPECT_EQ(client.Receive().body, "{\"a\": 1}");
}

TEST_F(HttpTest, RequestsInOnePieceAreAnsweredInOrder) {
  Start();
  Connection client = Connect();
  std::string requests;
  for (int i = 0; i < 200; ++i) requests += Post("/echo", std::to_string(i));
  client.Send(requests);
  for (int i = 0; i < 200; ++i) ASSERT_EQ(client.Receive().body, std::to_string(i));
}

TEST_F(HttpTest, ChunkedBodiesAreTaken) {
  Start();
  Connection client = Connect();
  client.Send(
      "POST /echo HTTP/1.1\r\nHost: x\r\nTransfer-Encoding: Chunked\r\n\r\n3;x=y\r\nabc\r\n2\r\nde\r\n0\r\nTrailer: "
      "1\r\n\r\n");
  EXPECT_EQ(client.Receive().body, "abcde");
  client.Send(Post("/echo", "next"));
  EXPECT_EQ(client.Receive().body, "next");
}

TEST_F(HttpTest, ABodyThatIsRefusedOnItsWayEndsTheConnection) {
  Start();
  Connection client = Connect();
  client.Send("POST /echo HTTP/1.1\r\nHost: x\r\nContent-Length: 100000000\r\n\r\nabc stop");
  EXPECT_EQ(client.Receive().body, "stopped");
  // Whoever sends on without looking still gets to see the answer, and then the end.
  client.Send(std::string(1000000, 'x'));
  client.FinishSending();
  EXPECT_TRUE(client.IsClosedByServer());
}

TEST_F(HttpTest, ARefusedHeadWithoutABodyKeepsTheConnection) {
  Start();
  Connection client = Connect();
  client.Send(Get("/no") + Post("/echo", "on"));
  EXPECT_EQ(client.Receive().status, 404);
  EXPECT_EQ(client.Receive().body, "on");
}

TEST_F(HttpTest, AnAnswerToHeadHasNoBody) {
  Start();
  Connection client = Connect();
  client.Send("HEAD /no HTTP/1.1\r\nHost: x\r\n\r\n" + Post("/echo", "on"));
  Reply reply = client.Receive(true);
  EXPECT_EQ(reply.status, 404);
  EXPECT_EQ(reply.headers["Content-Length"], "7");
  EXPECT_EQ(client.Receive().body, "on");
}

TEST_F(HttpTest, TheClientIsToldToContinueUnlessItIsRefused) {
  Start();
  const std::string expect = "Expect: 100-continue\r\nContent-Length: 2\r\n\r\n";
  Connection client = Connect();
  client.Send("POST /echo HTTP/1.1\r\nHost: x\r\n" + expect);
  EXPECT_EQ(client.Receive().status, 100);
  client.Send("ok");
  EXPECT_EQ(client.Receive().body, "ok");
  client.Send("POST /no HTTP/1.1\r\nHost: x\r\n" + expect);
  EXPECT_EQ(client.Receive().status, 404);

  Connection other = Connect();
  other.Send("POST /echo HTTP/1.1\r\nHost: x\r\nExpect: tea\r\nContent-Length: 2\r\n\r\n");
  EXPECT_EQ(other.Receive().status, 417);
}

TEST_F(HttpTest, TheConnectionLastsAsTheClientAsks) {
  Start();
  Connection closing = Connect();
  closing.Send("GET /no HTTP/1.1\r\nHost: x\r\nConnection: close\r\n\r\n");
  EXPECT_THAT(closing.ReceiveAll(), HasSubstr("Connection: close"));
  Connection old = Connect();
  old.Send("GET /no HTTP/1.0\r\n\r\n");
  EXPECT_THAT(old.ReceiveAll(), HasSubstr("refused"));
  Connection old_but_kept = Connect();
  old_but_kept.Send("GET /no HTTP/1.0\r\nConnection: keep-alive\r\n\r\n" + Get("/no"));
  EXPECT_EQ(old_but_kept.Receive().status, 404);
  EXPECT_EQ(old_but_kept.Receive().status, 404);
}

TEST_F(HttpTest, SlowSendersAreDroppedAndDisturbNobody) {
  HttpLimits limits;
  limits.head = limits.body = limits.idle = std::chrono::seconds(1);
  Start(limits);
  std::vector<Connection> slow;
  for (int i = 0; i < 100; ++i) slow.push_back(Connect());
  for (Connection& client : slow) client.Send("POST /echo HTTP/1.1\r\nHost");
  Connection body = Connect();
  body.Send("POST /echo HTTP/1.1\r\nHost: x\r\nContent-Length: 5\r\n\r\nab");
  Connection idle = Connect();
  idle.Send(Post("/echo", "on"));
  EXPECT_EQ(idle.Receive().body, "on");
  for (Connection& client : slow) EXPECT_TRUE(client.IsClosedByServer());
  EXPECT_TRUE(body.IsClosedByServer());
  EXPECT_TRUE(idle.IsClosedByServer());
  EXPECT_EQ(service_.heads(), 2);
}

TEST_F(HttpTest, AClientThatDoesNotReadIsDropped) {
  HttpLimits limits;
  limits.write = std::chrono::seconds(1);
  Start(limits);
  Connection client = Connect();
  const std::string request = Post("/echo", std::string(500000, 'x'));
  EXPECT_TRUE(Eventually([&] { return !client.Send(request); }));
}

TEST_F(HttpTest, ConnectionsBeyondTheLimitWaitForTheirTurn) {
  HttpLimits limits;
  limits.connections = 2;
  Start(limits);
  std::optional<Connection> first = Connect();
  Connection second = Connect();
  first->Send(Post("/echo", "1"));
  second.Send(Post("/echo", "2"));
  EXPECT_EQ(first->Receive().body, "1");
  EXPECT_EQ(second.Receive().body, "2");
  Connection third = Connect();
  third.Send(Post("/echo", "3"));
  second.Send(Post("/echo", "2"));
  EXPECT_EQ(second.Receive().body, "2");
  EXPECT_EQ(service_.heads(), 3);
  first.reset();
  EXPECT_EQ(third.Receive().body, "3");
}

TEST_F(HttpTest, StopClosesWhoeverHasNoRequestRunning) {
  Start();
  Connection idle = Connect();
  idle.Send(Post("/echo", "on"));
  EXPECT_EQ(idle.Receive().body, "on");
  Connection half = Connect();
  half.Send("POST /echo HTTP/1.1\r\nHost: x\r\nContent-Length: 5\r\n\r\nab");
  EXPECT_TRUE(Eventually([&] { return service_.heads() == 2; }));
  server_->Stop();
  server_->Join();
  EXPECT_TRUE(idle.IsClosedByServer());
  EXPECT_TRUE(half.IsClosedByServer());
  EXPECT_FALSE(Connect().connected());
}

}  // namespace
}  // namespace vorn::server
