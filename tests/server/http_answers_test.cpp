// The forms that an answer can have.
#include <gmock/gmock.h>
#include <zlib.h>

#include <filesystem>

#include "echo_service.h"

namespace vorn::server {
namespace {

using testing::HasSubstr;

std::string Unzip(const std::string& packed) {
  std::string text(100000, '\0');
  z_stream stream{};
  if (inflateInit2(&stream, MAX_WBITS + 16) != Z_OK) return "";
  std::string input = packed;
  stream.next_in = reinterpret_cast<Bytef*>(input.data());
  stream.avail_in = static_cast<uInt>(input.size());
  stream.next_out = reinterpret_cast<Bytef*>(text.data());
  stream.avail_out = static_cast<uInt>(text.size());
  const bool whole = inflate(&stream, Z_FINISH) == Z_STREAM_END;
  text.resize(whole ? stream.total_out : 0);
  inflateEnd(&stream);
  return text;
}

// A body of `pieces` times 1000 bytes whose total length is unknown. It fails at its end if `fails`.
class Generated : public BodySource {
 public:
  explicit Generated(int pieces, bool fails = false) : left_(pieces), fails_(fails) {}
  std::optional<std::uint64_t> Size() const override { return std::nullopt; }
  ssize_t Read(char* data, std::size_t size) override {
    if (left_ == 0) return fails_ ? -1 : 0;
    --left_;
    std::fill_n(data, std::min<std::size_t>(size, 1000), 'g');
    return 1000;
  }

 private:
  int left_;
  const bool fails_;
};

std::string GetWith(const std::string& headers) { return "GET /fixed HTTP/1.1\r\nHost: x\r\n" + headers + "\r\n"; }

TEST_F(HttpTest, LargeAnswersAreCompressedOnRequest) {
  Start();
  const std::string large(5000, 'a');
  service_.SetFixed({200, large});
  const struct {
    const char* headers;
    bool packed;
  } cases[] = {
      {"", false},
      {"Accept-Encoding: gzip\r\n", true},
      {"Accept-Encoding: br;q=1.0, GZip;q=0.5\r\n", true},
      {"Accept-Encoding: *\r\n", true},
      {"Accept-Encoding: gzip;q=0\r\n", false},
      {"Accept-Encoding: gzip;q=0, *\r\n", false},
      {"Accept-Encoding: br, identity\r\n", false},
  };
  Connection client = Connect();
  for (const auto& c : cases) {
    client.Send(GetWith(c.headers));
    Reply reply = client.Receive();
    EXPECT_EQ(reply.headers["Vary"], "Accept-Encoding") << c.headers;
    EXPECT_EQ(reply.headers["Content-Encoding"], c.packed ? "gzip" : "") << c.headers;
    EXPECT_EQ(c.packed ? Unzip(reply.body) : reply.body, large) << c.headers;
  }
}

TEST_F(HttpTest, AnAnswerFromAWorkerIsCompressedToo) {
  Start();
  Connection client = Connect();
  const std::string large(5000, 'b');
  client.Send(Post("/echo", large, "Accept-Encoding: gzip\r\n"));
  const Reply reply = client.Receive();
  EXPECT_LT(reply.body.size(), 100U);
  EXPECT_EQ(Unzip(reply.body), large);
}

TEST_F(HttpTest, ACompressedAnswerHasAStrongTagOfItsOwn) {
  Start();
  Connection client = Connect();
  const struct {
    const char* tag;
    const char* packed;
  } cases[] = {{"\"7\"", "\"7-gzip\""}, {"W/\"7\"", "W/\"7\""}};
  for (const auto& c : cases) {
    service_.SetFixed({200, std::string(5000, 'a'), {{"ETag", c.tag}}});
    client.Send(GetWith(""));
    EXPECT_EQ(client.Receive().headers["ETag"], c.tag);
    client.Send(GetWith("Accept-Encoding: gzip\r\n"));
    EXPECT_EQ(client.Receive().headers["ETag"], c.packed);
  }
}

TEST_F(HttpTest, SmallAnswersAreNotCompressed) {
  Start();
  service_.SetFixed({200, std::string(1024, 'a')});
  Connection client = Connect();
  client.Send(GetWith("Accept-Encoding: gzip\r\n"));
  Reply reply = client.Receive();
  EXPECT_EQ(reply.body.size(), 1024U);
  EXPECT_EQ(reply.headers.count("Vary"), 0U);
}

TEST_F(HttpTest, AVersionThatTheClientHasIsNotSentAgain) {
  Start();
  service_.SetFixed({200, "body", {{"ETag", "W/\"7\""}}});
  const struct {
    const char* headers;
    int status;
  } cases[] = {
      {"", 200},
      {"If-None-Match: W/\"7\"\r\n", 304},
      {"If-None-Match: \"6\", \"7\"\r\n", 304},
      {"If-None-Match: *\r\n", 304},
      {"If-None-Match: \"8\"\r\n", 200},
  };
  Connection client = Connect();
  for (const auto& c : cases) {
    client.Send(GetWith(c.headers));
    Reply reply = client.Receive();
    EXPECT_EQ(reply.status, c.status) << c.headers;
    EXPECT_EQ(reply.body, c.status == 200 ? "body" : "") << c.headers;
    EXPECT_EQ(reply.headers["ETag"], "W/\"7\"") << c.headers;
  }
}

TEST_F(HttpTest, AnAnswerCanBeAFile) {
  Start();
  const std::string content(300000, 'f');
  sandbox_.Write("page", content);
  Response response{200, ""};
  response.content_type = "text/html; charset=utf-8";
  response.source = OpenFileBody(sandbox_.File("page"));
  ASSERT_NE(response.source, nullptr);
  service_.SetFixed(response);
  Connection client = Connect();
  client.Send(GetWith(""));
  Reply reply = client.Receive();
  EXPECT_EQ(reply.headers["Content-Type"], "text/html; charset=utf-8");
  EXPECT_EQ(reply.body, content);
  client.Send(Get("/no"));
  EXPECT_EQ(client.Receive().status, 404);
}

TEST_F(HttpTest, OnlyRegularFilesCanBeAnswers) {
  EXPECT_EQ(OpenFileBody(sandbox_.File("missing")), nullptr);
  EXPECT_EQ(OpenFileBody(sandbox_.path()), nullptr);
}

TEST_F(HttpTest, AFileThatBecomesShorterEndsTheConnection) {
  Start();
  sandbox_.Write("page", std::string(300000, 'f'));
  Response response{200, ""};
  response.source = OpenFileBody(sandbox_.File("page"));
  std::filesystem::resize_file(sandbox_.File("page"), 10);
  service_.SetFixed(response);
  Connection client = Connect();
  client.Send(GetWith(""));
  EXPECT_EQ(client.Receive().status, 0) << "not a whole reply";
}

TEST_F(HttpTest, AGeneratedAnswerIsChunked) {
  Start();
  Response response{200, ""};
  response.source = std::make_shared<Generated>(3);
  service_.SetFixed(response);
  Connection client = Connect();
  client.Send(GetWith("Connection: close\r\n"));
  const std::string all = client.ReceiveAll();
  EXPECT_THAT(all, HasSubstr("Transfer-Encoding: chunked\r\n"));
  const std::string piece = "3e8\r\n" + std::string(1000, 'g') + "\r\n";
  EXPECT_THAT(all, testing::EndsWith("\r\n\r\n" + piece + piece + piece + "0\r\n\r\n"));
}

TEST_F(HttpTest, AGeneratedAnswerToAnOldClientEndsWithTheConnection) {
  Start();
  Response response{200, ""};
  response.source = std::make_shared<Generated>(2);
  service_.SetFixed(response);
  Connection client = Connect();
  client.Send("GET /fixed HTTP/1.0\r\nConnection: keep-alive\r\n\r\n");
  const std::string all = client.ReceiveAll();
  EXPECT_THAT(all, HasSubstr("Connection: close\r\n"));
  EXPECT_THAT(all, testing::EndsWith("\r\n\r\n" + std::string(2000, 'g')));
}

TEST_F(HttpTest, AGeneratedAnswerThatFailsIsNotTakenForAWholeOne) {
  Start();
  Response response{200, ""};
  response.source = std::make_shared<Generated>(1, true);
  service_.SetFixed(response);
  Connection client = Connect();
  client.Send(GetWith(""));
  EXPECT_THAT(client.ReceiveAll(), testing::EndsWith("g\r\n"));
}

TEST_F(HttpTest, TheServiceSeesAllHeadersAndThePeer) {
  Start();
  Connection client = Connect();
  client.Send("GET /no HTTP/1.1\r\nHost: x\r\nSec-Fetch-Site: none\r\nX-Own: 1\r\n\r\n");
  EXPECT_EQ(client.Receive().status, 404);
  EchoService::Seen seen = service_.last();
  EXPECT_EQ(seen.headers["Sec-Fetch-Site"], "none");
  EXPECT_EQ(seen.headers["X-Own"], "1");
  EXPECT_EQ(seen.peer.address, "unix");
  ASSERT_TRUE(seen.peer.credentials);
  EXPECT_EQ(seen.peer.credentials->pid, getpid());
  EXPECT_EQ(seen.peer.credentials->uid, geteuid());

  Connection tcp = ConnectTcp();
  tcp.Send(Get("/no"));
  EXPECT_EQ(tcp.Receive().status, 404);
  seen = service_.last();
  EXPECT_EQ(seen.peer.address, "127.0.0.1");
  EXPECT_TRUE(seen.peer.loopback);
  EXPECT_FALSE(seen.peer.credentials);
}

}  // namespace
}  // namespace vorn::server
