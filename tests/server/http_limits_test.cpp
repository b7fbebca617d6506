// The transport's limits: misbehaving clients cannot exhaust the resources of others.
#include <gmock/gmock.h>
#include <sys/resource.h>

#include <atomic>
#include <filesystem>
#include <future>
#include <iterator>

#include "echo_service.h"

namespace vorn::server {
namespace {

constexpr std::chrono::seconds kShort{1};

std::ptrdiff_t CountDescriptors() {
  const std::filesystem::directory_iterator descriptors("/proc/self/fd");
  return std::distance(begin(descriptors), end(descriptors));
}

// Refuses every request. "/gate" holds the network thread until the gate opens.
class GatedService : public Service {
 public:
  std::variant<std::shared_ptr<Exchange>, Response> Begin(const Head& head) override {
    if (head.target == "/gate") {
      reached.set_value();
      gate.get_future().wait();
    }
    descriptors = CountDescriptors();
    return Response{404, "refused"};
  }
  Response Refuse(int status, std::string_view text) const override { return {status, std::string(text)}; }

  std::promise<void> reached;
  std::promise<void> gate;
  std::atomic<std::ptrdiff_t> descriptors{0};  // of this process, when the last request was begun
};

// Clients and server are in one process, so the number of its descriptors shows how many connections are accepted.
TEST(Accepting, TakesTurnsWithTheRequestsOfOtherConnections) {
  const Sandbox sandbox;
  const std::string path = sandbox.File("socket");
  std::string error;
  std::vector<Listener> listeners;
  listeners.push_back(*OpenListener("unix:" + path, &error));
  GatedService service;
  HttpServer server(service, std::move(listeners));
  Connection other = Connection::ToUnix(path);
  other.Send(Get("/"));
  EXPECT_EQ(other.Receive().status, 404);
  Connection gate = Connection::ToUnix(path);
  gate.Send(Get("/gate"));
  service.reached.get_future().wait();
  std::vector<Connection> many;
  for (int i = 0; i < 200; ++i) many.push_back(Connection::ToUnix(path));
  const std::ptrdiff_t before = CountDescriptors();
  other.Send(Get("/"));
  service.gate.set_value();
  EXPECT_EQ(other.Receive().status, 404);
  EXPECT_GT(service.descriptors, before) << "connections are accepted before the request, which arrived later";
  EXPECT_LE(service.descriptors, before + 32);
  many.back().Send(Get("/"));
  EXPECT_EQ(many.back().Receive().status, 404);
}

TEST_F(HttpTest, SlowSendersAreAnsweredAndDroppedAndDelayNoOtherClient) {
  HttpLimits limits;
  limits.head = limits.body = limits.idle = kShort;
  Start(limits);
  Connection silent = Connect();
  std::vector<Connection> slow;
  for (int i = 0; i < 100; ++i) slow.push_back(Connect());
  for (Connection& client : slow) client.Send("POST /echo HTTP/1.1\r\nHost");
  Connection body = Connect();
  body.Send("POST /echo HTTP/1.1\r\nHost: x\r\nContent-Length: 5\r\n\r\nab");
  Connection idle = Connect();
  idle.Send(Post("/echo", "on"));
  EXPECT_EQ(idle.Receive().body, "on");
  for (Connection& client : slow) EXPECT_EQ(client.Receive().status, 408);
  for (Connection& client : slow) EXPECT_TRUE(client.IsClosedByServer());
  EXPECT_EQ(body.Receive().status, 408);
  EXPECT_TRUE(body.IsClosedByServer());
  EXPECT_TRUE(idle.IsClosedByServer());
  EXPECT_TRUE(silent.IsClosedByServer()) << "who has sent nothing is told nothing";
  EXPECT_EQ(service_.heads(), 2);
}

TEST_F(HttpTest, ABodyThatIsChargedAndComesTooSlowlyIsRefused) {
  HttpLimits limits;
  limits.body = std::chrono::hours(1);
  limits.body_grace = kShort;
  Budget memory(1000000, 1000000);
  Start(limits, {&memory, nullptr});
  Connection small = Connect();
  small.Send("POST /echo HTTP/1.1\r\nHost: x\r\nContent-Length: 3\r\n\r\na");
  Connection slow = Connect();
  slow.Send("POST /echo HTTP/1.1\r\nHost: x\r\nContent-Length: 600000\r\n\r\nab");
  EXPECT_EQ(slow.Receive().status, 408);
  EXPECT_TRUE(Eventually([&] { return memory.used() == 0; }));
  small.Send("bc");
  EXPECT_EQ(small.Receive().body, "abc") << "a body that is not charged has time";
}

TEST_F(HttpTest, ABodyThatComesAtTheRequiredRateIsTaken) {
  HttpLimits limits;
  limits.body_grace = std::chrono::seconds(0);
  limits.body_rate = 1;
  Budget memory(1000000, 1000000);
  Start(limits, {&memory, nullptr});
  Connection client = Connect();
  client.Send("POST /echo HTTP/1.1\r\nHost: x\r\nContent-Length: 100000\r\n\r\n" + std::string(99999, 'x'));
  std::this_thread::sleep_for(std::chrono::seconds(3));  // in which the rate is judged at least twice
  client.Send("x");
  EXPECT_EQ(client.Receive().status, 200);
}

// One client occupies the network thread for one piece at a time.
TEST_F(HttpTest, ABodyIsReadInPieces) {
  Start();
  Connection client = Connect();
  client.Send(Post("/echo", std::string(1000000, 'x')));
  EXPECT_EQ(client.Receive().body.size(), 1000000U);
  EXPECT_LE(service_.largest_piece(), 8192U);
}

TEST_F(HttpTest, AClientThatDoesNotReadIsDropped) {
  HttpLimits limits;
  limits.write = kShort;
  Start(limits);
  Connection client = Connect();
  const std::string request = Post("/echo", std::string(500000, 'x'));
  EXPECT_TRUE(Eventually([&] { return !client.Send(request); }));
}

TEST_F(HttpTest, TheConnectionThatIsIdleLongestMakesRoom) {
  HttpLimits limits;
  limits.unix_connections = {3, 3};
  Start(limits);
  Connection oldest = Connect();
  Connection busy = Connect();
  Connection newer = Connect();
  for (Connection* client : {&oldest, &newer}) {
    client->Send(Get("/no"));
    EXPECT_EQ(client->Receive().status, 404);
  }
  busy.Send(Post("/hold", "1"));
  const Answer held = service_.AwaitHeld();
  Connection next = Connect();
  next.Send(Get("/no"));
  EXPECT_EQ(next.Receive().status, 404);
  EXPECT_TRUE(oldest.IsClosedByServer());
  newer.Send(Get("/no"));
  EXPECT_EQ(newer.Receive().status, 404);
  held({200, "held"});
  EXPECT_EQ(busy.Receive().body, "held");
}

TEST_F(HttpTest, SlowClientsMakeRoomToo) {
  HttpLimits limits;
  limits.unix_connections = {20, 20};
  Start(limits);
  std::vector<Connection> slow;
  for (int i = 0; i < 100; ++i) {
    slow.push_back(Connect());
    slow.back().Send(i % 2 == 0 ? "GET /no HT" : "POST /echo HTTP/1.1\r\nHost: x\r\nContent-Length: 9\r\n\r\na");
  }
  for (int i = 0; i < 10; ++i) {
    Connection good = Connect();
    good.Send(Post("/echo", "good"));
    EXPECT_EQ(good.Receive().body, "good");
  }
  EXPECT_TRUE(slow[0].IsClosedByServer());
}

TEST_F(HttpTest, AConnectionBeyondTheLimitIsAnswered503WhenAllOthersAreWorking) {
  HttpLimits limits;
  limits.unix_connections = {2, 2};
  Start(limits);
  Connection first = Connect();
  Connection second = Connect();
  std::vector<Answer> answers;
  for (Connection* client : {&first, &second}) {
    client->Send(Post("/hold", "1"));
    answers.push_back(service_.AwaitHeld());
  }
  Connection third = Connect();
  Reply reply = third.Receive();
  EXPECT_EQ(reply.status, 503);
  EXPECT_EQ(reply.headers["Retry-After"], "1");
  for (const Answer& answer : answers) answer({200, "held"});
  EXPECT_EQ(first.Receive().body, "held");
  EXPECT_EQ(second.Receive().body, "held");
}

// Otherwise a client that sends requests without pause would take each free place before the others.
TEST_F(HttpTest, ABusyAnswerEndsTheConnection) {
  Start();
  service_.SetFixed({503, "busy"});
  Connection client = Connect();
  client.Send(Get("/fixed") + Get("/fixed"));
  const Reply busy = client.Receive();
  EXPECT_EQ(busy.status, 503);
  EXPECT_EQ(busy.headers.at("Connection"), "close");
  EXPECT_TRUE(client.IsClosedByServer()) << "the second request is not answered";
}

TEST_F(HttpTest, EachListenerHasItsOwnShare) {
  HttpLimits limits;
  limits.tcp_connections = {4, 4};
  Start(limits);
  Connection local = Connect();
  local.Send(Get("/no"));
  EXPECT_EQ(local.Receive().status, 404);
  std::vector<Connection> remote;
  for (int i = 0; i < 50; ++i) remote.push_back(ConnectTcp());
  remote.back().Send(Get("/no"));
  EXPECT_EQ(remote.back().Receive().status, 404);
  EXPECT_TRUE(remote.front().IsClosedByServer());
  local.Send(Get("/no"));
  EXPECT_EQ(local.Receive().status, 404) << "idle longest of all, but of another listener";
}

// Lowers the limit of descriptors to those that are open now and a few more.
class FewDescriptors {
 public:
  explicit FewDescriptors(rlim_t more) {
    getrlimit(RLIMIT_NOFILE, &before_);
    const int next = dup(0);
    close(next);
    rlimit few = before_;
    few.rlim_cur = static_cast<rlim_t>(next) + more;
    setrlimit(RLIMIT_NOFILE, &few);
  }
  ~FewDescriptors() { setrlimit(RLIMIT_NOFILE, &before_); }
  FewDescriptors(const FewDescriptors&) = delete;
  FewDescriptors& operator=(const FewDescriptors&) = delete;

 private:
  rlimit before_{};
};

TEST_F(HttpTest, WithoutDescriptorsTheIdleMakeRoomForTheNext) {
  Start();
  std::vector<Connection> idle;
  for (int i = 0; i < 20; ++i) {
    idle.push_back(Connect());
    idle.back().Send(Get("/no"));
    EXPECT_EQ(idle.back().Receive().status, 404);
  }
  const FewDescriptors few(1);  // for the client's side of one connection, and none for the server's
  Connection next = Connect();
  ASSERT_TRUE(next.connected());
  next.Send(Get("/no"));
  EXPECT_EQ(next.Receive().status, 404);
  EXPECT_TRUE(idle.front().IsClosedByServer());
}

TEST(FitToDescriptors, LeavesTheServersOwnFilesTheirReserve) {
  std::string error;
  const Sandbox sandbox;
  std::vector<Listener> listeners;
  listeners.push_back(*OpenListener("unix:" + sandbox.File("s"), &error));
  listeners.push_back(*OpenListener("127.0.0.1:0", &error));
  const HttpLimits wanted;
  EXPECT_EQ(FitToDescriptors(wanted, listeners, 1100).tcp_connections.total, wanted.tcp_connections.total);
  for (const rlim_t descriptors : {300, 500, 1000}) {
    const HttpLimits fit = FitToDescriptors(wanted, listeners, descriptors);
    EXPECT_LE(fit.tcp_connections.total + fit.unix_connections.total + 192, descriptors);
    EXPECT_GT(fit.unix_connections.total, 8U) << "the Unix socket keeps its part";
    EXPECT_LE(fit.tcp_connections.per_address, fit.tcp_connections.total);
  }
  EXPECT_GE(FitToDescriptors(wanted, listeners, 64).unix_connections.total, 8U);
}

TEST_F(HttpTest, ABodyBeyondTheBudgetIsRefusedBeforeItIsRead) {
  Budget memory(1150000, 1150000);
  Start({}, {&memory, nullptr});
  Connection first = Connect();
  first.Send("POST /echo HTTP/1.1\r\nHost: x\r\nContent-Length: 600000\r\n\r\n");
  EXPECT_TRUE(Eventually([&] { return memory.used() == 600000; }));
  Connection second = Connect();
  second.Send("POST /echo HTTP/1.1\r\nHost: x\r\nExpect: 100-continue\r\nContent-Length: 600000\r\n\r\n");
  Reply busy = second.Receive();
  EXPECT_EQ(busy.status, 503);
  EXPECT_EQ(busy.headers["Retry-After"], "1");
  Connection chunked = Connect();
  chunked.Send("POST /echo HTTP/1.1\r\nHost: x\r\nTransfer-Encoding: chunked\r\n\r\n");
  EXPECT_EQ(chunked.Receive().status, 503) << "of unknown length";
  Connection small = Connect();
  small.Send(Post("/echo", std::string(5000, 's')));
  EXPECT_EQ(small.Receive().body.size(), 5000U) << "small bodies are not charged";
  first.Send(std::string(600000, 'x'));
  EXPECT_EQ(first.Receive().body.size(), 600000U);
  EXPECT_EQ(memory.used(), 0U);
}

TEST_F(HttpTest, ABodyThatNeverFitsIntoTheBudgetIsTooLarge) {
  Budget memory(100000, 100000);
  Start({}, {&memory, nullptr});
  for (const char* length : {"Content-Length: 100001", "Transfer-Encoding: chunked"}) {
    Connection client = Connect();
    client.Send(std::string("POST /echo HTTP/1.1\r\nHost: x\r\n") + length + "\r\n\r\n");
    EXPECT_EQ(client.Receive().status, 413) << length;
  }
  Connection client = Connect();
  client.Send(Post("/echo", std::string(100000, 'x')));
  EXPECT_EQ(client.Receive().status, 200);
}

TEST_F(HttpTest, TheBudgetGetsBackWhatAVanishedClientHeld) {
  Budget memory(1000000, 1000000);
  Start({}, {&memory, nullptr});
  {
    Connection client = Connect();
    client.Send("POST /echo HTTP/1.1\r\nHost: x\r\nContent-Length: 600000\r\n\r\nabc");
    EXPECT_TRUE(Eventually([&] { return memory.used() == 600000; }));
  }
  EXPECT_TRUE(Eventually([&] { return memory.used() == 0; }));
}

TEST_F(HttpTest, NoBodyIsAskedForBeforeTheRequestIsAuthorised) {
  Start();
  Connection client = Connect();
  client.Send("POST /ask HTTP/1.1\r\nHost: x\r\nExpect: 100-continue\r\nContent-Length: 2\r\n\r\n");
  const Proceed granted = service_.AwaitAsked();
  std::thread([granted] { granted(std::nullopt); }).join();
  EXPECT_EQ(client.Receive().status, 100);
  client.Send("ok");
  EXPECT_EQ(client.Receive().body, "ok");

  client.Send("POST /ask HTTP/1.1\r\nHost: x\r\nExpect: 100-continue\r\nContent-Length: 2\r\n\r\n");
  const Proceed refused = service_.AwaitAsked();
  std::thread([refused] { refused(Response{401, "who?"}); }).join();
  EXPECT_EQ(client.Receive().status, 401);
}

TEST_F(HttpTest, ABodyThatArrivesDuringAuthorisationIsKept) {
  Start();
  Connection client = Connect();
  client.Send(Post("/ask", "early") + Post("/echo", "next"));
  service_.AwaitAsked()(std::nullopt);
  EXPECT_EQ(client.Receive().body, "early");
  EXPECT_EQ(client.Receive().body, "next");
}

TEST_F(HttpTest, ACallIsToldThatItsClientHasLeft) {
  Start();
  std::optional<Connection> client = ConnectTcp();
  client->Send(Post("/hold", "1"));
  const Answer answer = service_.AwaitHeld();
  client.reset();
  EXPECT_TRUE(Eventually([&] { return service_.abandoned() == 1; }));
  answer({200, "not read by the client"});
}

TEST_F(HttpTest, AClientThatOnlyFinishesSendingGetsItsAnswer) {
  Start();
  Connection client = ConnectTcp();
  client.Send(Post("/hold", "1"));
  client.FinishSending();
  service_.AwaitHeld()({200, "late"});
  EXPECT_EQ(client.Receive().body, "late");
}

}  // namespace
}  // namespace vorn::server
