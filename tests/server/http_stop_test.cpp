// Stopping the transport while calls run, and answers that arrive afterwards. These tests find errors of
// lifetime only under the address and thread sanitizers.
#include <gmock/gmock.h>

#include <atomic>

#include "echo_service.h"

namespace vorn::server {
namespace {

TEST_F(HttpTest, StopAwaitsTheAnswerOfARunningCall) {
  Start();
  Connection client = Connect();
  client.Send(Post("/hold", "1"));
  const Answer answer = service_.AwaitHeld();
  server_->Stop();
  EXPECT_FALSE(server_->JoinFor(std::chrono::milliseconds(50)));
  EXPECT_TRUE(Eventually([&] { return !Connect().connected(); })) << "no new connections";
  answer({200, "done"});
  Reply reply = client.Receive();
  EXPECT_EQ(reply.body, "done");
  EXPECT_EQ(reply.headers["Connection"], "close");
  client.FinishSending();
  EXPECT_TRUE(server_->JoinFor(kGenerous));
}

TEST_F(HttpTest, StopCutsAClientThatDoesNotRead) {
  HttpLimits limits;
  limits.write = std::chrono::hours(1);
  limits.last_write = std::chrono::seconds(1);
  Start(limits);
  Connection client = Connect();
  client.Send(Post("/hold", "1"));
  const Answer answer = service_.AwaitHeld();
  answer({200, std::string(10000000, 'x')});
  server_->Stop();
  EXPECT_TRUE(server_->JoinFor(kGenerous));
}

TEST_F(HttpTest, AnAnswerAfterTheEndOfTheServerIsDropped) {
  Start();
  Connection client = Connect();
  client.Send(Post("/hold", "1"));
  const Answer answer = service_.AwaitHeld();
  Connection other = Connect();
  other.Send("POST /ask HTTP/1.1\r\nHost: x\r\n\r\n");
  const Proceed proceed = service_.AwaitAsked();
  server_.reset();
  EXPECT_TRUE(client.IsClosedByServer());
  answer({200, std::string(5000, 'x')});
  proceed(std::nullopt);
}

TEST_F(HttpTest, AnswersMayComeFromManyThreadsWhileTheServerEnds) {
  for (int round = 0; round < 20; ++round) {
    Start();
    std::vector<Connection> clients;
    std::vector<std::thread> workers;
    std::atomic<bool> go{false};
    for (int i = 0; i < 8; ++i) {
      clients.push_back(Connect());
      clients.back().Send(Post("/hold", "1"));
      workers.emplace_back([&go, answer = service_.AwaitHeld()] {
        while (!go) std::this_thread::yield();
        answer({200, std::string(2000, 'x')});
      });
    }
    go = true;
    server_->Stop();
    if (round % 2 == 0) server_->JoinFor(std::chrono::milliseconds(round));
    server_.reset();
    for (std::thread& worker : workers) worker.join();
  }
}

TEST_F(HttpTest, AnAnswerToAConnectionThatHasEndedIsDropped) {
  Start();
  std::optional<Connection> client = Connect();
  client->Send(Post("/hold", "1"));
  const Answer answer = service_.AwaitHeld();
  client.reset();
  answer({200, "1"});
  Connection next = Connect();
  next.Send(Post("/echo", "on"));
  EXPECT_EQ(next.Receive().body, "on");
}

}  // namespace
}  // namespace vorn::server
