// Rules of RFC 9110 and RFC 9112 that a client may rely on.
#include <gmock/gmock.h>

#include "echo_service.h"

namespace vorn::server {
namespace {

using testing::HasSubstr;
using testing::Not;

const std::string kHost = "Host: x\r\n";

TEST_F(HttpTest, NoContinueIsSentOnceTheBodyHasBegunToArrive) {
  Start();
  Connection client = Connect();
  client.Send("POST /echo HTTP/1.1\r\n" + kHost + "Expect: 100-continue\r\nContent-Length: 2\r\n\r\no");
  EXPECT_TRUE(Eventually([&] { return service_.heads() == 1; }));
  client.Send("k");
  EXPECT_EQ(client.Receive().status, 200);
}

TEST_F(HttpTest, NoContinueFollowsAFinalAnswer) {
  Start();
  Connection client = Connect();
  client.Send("POST /echo HTTP/1.1\r\n" + kHost + "Expect: 100-continue\r\nContent-Length: 100\r\n\r\nstop");
  client.FinishSending();
  const std::string all = client.ReceiveAll();
  EXPECT_THAT(all, HasSubstr("413"));
  EXPECT_THAT(all, Not(HasSubstr("100 Continue")));
}

TEST_F(HttpTest, AnOldClientIsNotToldToContinue) {
  Start();
  Connection client = Connect();
  client.Send("POST /echo HTTP/1.0\r\nExpect: 100-continue\r\nContent-Length: 2\r\n\r\n");
  EXPECT_TRUE(Eventually([&] { return service_.heads() == 1; }));
  client.Send("ok");
  EXPECT_THAT(client.ReceiveAll(), testing::StartsWith("HTTP/1.1 200"));
}

TEST_F(HttpTest, TargetsMayBeAbsoluteAndHaveAQuery) {
  Start();
  const struct {
    const char* target;
    const char* path;
    const char* query;
    const char* host;
  } cases[] = {
      {"/no?a=1&b", "/no", "a=1&b", "x"},
      {"/no?", "/no", "", "x"},
      {"http://other:8080/no?q", "/no", "q", "other:8080"},
      {"HTTPS://other/no", "/no", "", "other"},
      {"http://other", "/", "", "other"},
      {"http://other?q", "/", "q", "other"},
  };
  for (const auto& c : cases) {
    Connection client = Connect();
    client.Send("GET " + std::string(c.target) + " HTTP/1.1\r\n" + kHost + "\r\n");
    EXPECT_NE(client.Receive().status, 0) << c.target;
    const EchoService::Seen seen = service_.last();
    EXPECT_EQ(seen.target, c.path) << c.target;
    EXPECT_EQ(seen.query, c.query) << c.target;
    EXPECT_EQ(seen.host, c.host) << c.target;
  }
}

TEST_F(HttpTest, AStarIsTheTargetOfOptionsForTheWholeServer) {
  Start();
  Connection client = Connect();
  client.Send("OPTIONS http://other HTTP/1.1\r\n" + kHost + "\r\n");
  EXPECT_NE(client.Receive().status, 0);
  EXPECT_EQ(service_.last().target, "*");
}

TEST_F(HttpTest, KeepAliveIsAnnouncedToOldClients) {
  Start();
  Connection client = Connect();
  client.Send("GET /no HTTP/1.0\r\nConnection: keep-alive\r\n\r\n");
  EXPECT_EQ(client.Receive().headers["Connection"], "keep-alive");
  client.Send("GET /no HTTP/1.0\r\n\r\n");
  EXPECT_EQ(client.Receive().headers["Connection"], "close");
  EXPECT_TRUE(client.IsClosedByServer());
}

TEST_F(HttpTest, EmptyLinesBeforeARequestAreSkipped) {
  Start();
  Connection client = Connect();
  client.Send("\r\n\r\n" + Post("/echo", "1") + "\r\n" + Post("/echo", "2"));
  EXPECT_EQ(client.Receive().body, "1");
  EXPECT_EQ(client.Receive().body, "2");
}

TEST_F(HttpTest, LaterMinorVersionsAreAnsweredAsOnePointOne) {
  Start();
  Connection client = Connect();
  client.Send("GET /no HTTP/1.7\r\n" + kHost + "\r\n" + Get("/no"));
  EXPECT_EQ(client.Receive().status, 404);
  EXPECT_EQ(client.Receive().status, 404);
}

TEST_F(HttpTest, ARefusalNamesTheValueThatIsNotUnderstood) {
  Start();
  const struct {
    const char* headers;
    int status;
    const char* text;
  } cases[] = {
      {"Transfer-Encoding: gzip, chunked\r\n", 501, "gzip"},
      {"Transfer-Encoding: xchunked\r\n", 501, "xchunked"},
      {"Transfer-Encoding: chunked, chunked\r\n", 400, "chunked exactly once"},
      {"Content-Encoding: br\r\nContent-Length: 0\r\n", 415, "br"},
      {"Content-Type: a/b\r\nContent-Type: a/b\r\nContent-Length: 0\r\n", 400, "Content-Type"},
  };
  for (const auto& c : cases) {
    Connection client = Connect();
    client.Send("POST /echo HTTP/1.1\r\n" + kHost + c.headers + "\r\n");
    const Reply reply = client.Receive();
    EXPECT_EQ(reply.status, c.status) << c.headers;
    EXPECT_THAT(reply.body, HasSubstr(c.text)) << c.headers;
  }
  EXPECT_EQ(service_.heads(), 0);
}

TEST_F(HttpTest, AnIdentityContentCodingIsNoCoding) {
  Start();
  Connection client = Connect();
  client.Send(Post("/echo", "ok", "Content-Encoding: Identity\r\n"));
  EXPECT_EQ(client.Receive().body, "ok");
}

}  // namespace
}  // namespace vorn::server
