#include "http.h"

#include <gmock/gmock.h>

#include "echo_service.h"

namespace vorn::server {
namespace {

using testing::HasSubstr;

TEST_F(HttpTest, TellsTheServiceHowBusyAConnectionIs) {
  Start();
  Connection client = Connect();
  std::string requests;
  for (int i = 0; i < 64; ++i) requests += Post("/a", "{}");
  client.Send(requests);
  for (int i = 0; i < 64; ++i) ASSERT_EQ(client.Receive().status, 200);
  EXPECT_GT(service_.last().recent_requests, 0U);
  Connection other = Connect();
  other.Send(Post("/a", "{}"));
  other.Receive();
  EXPECT_EQ(service_.last().recent_requests, 0U);
}

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
  // A client that keeps sending without reading still receives the answer, and then the end of the connection.
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
