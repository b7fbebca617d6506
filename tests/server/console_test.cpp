#include "console.h"

#include <gmock/gmock.h>
#include <unistd.h>
#include <zlib.h>

#include <filesystem>

#include "sandbox.h"
#include "server_process.h"

namespace vorn::server {
namespace {

using testing::HasSubstr;
using testing::Not;

// The folder of a page whose compressed forms are marked, so that the tests can tell which one was sent.
class ConsoleTest : public testing::Test {
 protected:
  ConsoleTest() {
    std::filesystem::create_directories(sandbox_.File("page/assets"));
    sandbox_.Write("page/index.html", "the page");
    sandbox_.Write("page/index.html.gz", "the page, packed");
    sandbox_.Write("page/theme.js", "theme");
    sandbox_.Write("page/assets/main-1a2b.js", "code");
    sandbox_.Write("page/assets/main-1a2b.js.gz", "code, packed");
    sandbox_.Write("page/assets/main-1a2b.css", "style");
    sandbox_.Write("page/picture.svg", "<svg/>");
    sandbox_.Write("page/notes.txt", "licences");
    sandbox_.Write("page/secret.key", "not for the page");
  }

  static Head Wants(std::string_view target, std::string_view encoding = "") {
    Head head;
    head.method = "GET";
    head.target = target;
    if (!encoding.empty()) head.headers.emplace_back("Accept-Encoding", encoding);
    return head;
  }
  static std::string Header(const Response& response, const std::string& name) {
    for (const auto& [key, value] : response.headers) {
      if (key == name) return value;
    }
    return "";
  }
  // The whole body, read in small pieces, as the transport may do.
  static std::string Body(const Response& response) {
    if (!response.source) return response.body;
    std::string all;
    char piece[3];
    for (ssize_t count = 0; (count = response.source->Read(piece, sizeof piece)) > 0;) {
      all.append(piece, static_cast<std::size_t>(count));
    }
    EXPECT_EQ(all.size(), response.source->Size());
    return all;
  }

  Sandbox sandbox_;
};

TEST_F(ConsoleTest, HasTheFilesOfItsFolder) {
  const Console console(sandbox_.File("page"));
  const struct {
    const char* target;
    const char* type;
    const char* body;
  } cases[] = {
      {"/", "text/html; charset=utf-8", "the page"},
      {"/theme.js", "text/javascript; charset=utf-8", "theme"},
      {"/assets/main-1a2b.js", "text/javascript; charset=utf-8", "code"},
      {"/assets/main-1a2b.css", "text/css; charset=utf-8", "style"},
      {"/picture.svg", "image/svg+xml", "<svg/>"},
      {"/notes.txt", "text/plain; charset=utf-8", "licences"},
  };
  for (const auto& c : cases) {
    ASSERT_TRUE(console.Owns(c.target)) << c.target;
    const Response response = console.Get(Wants(c.target));
    EXPECT_EQ(response.status, 200) << c.target;
    EXPECT_EQ(response.content_type, c.type) << c.target;
    EXPECT_EQ(Body(response), c.body) << c.target;
  }
}

TEST_F(ConsoleTest, OwnsNothingElse) {
  const Console console(sandbox_.File("page"));
  for (const char* target : {"/index.html", "/index.html.gz", "/secret.key", "/api", "/theme.js/", "/theme.js.gz",
                             "/../page/theme.js", "/./theme.js", "//theme.js", "/THEME.JS", "/assets", "", "*"}) {
    EXPECT_FALSE(console.Owns(target)) << target;
  }
}

TEST_F(ConsoleTest, AnswersUnknownAssetsItself) {
  const Console console(sandbox_.File("page"));
  for (const char* target : {"/assets/", "/assets/main-old.js", "/assets/../theme.js", "/assets/../../../etc/passwd",
                             "/assets/main-1a2b.js.gz", "/assets/%2e%2e/theme.js"}) {
    ASSERT_TRUE(console.Owns(target)) << target;
    const Response response = console.Get(Wants(target));
    EXPECT_EQ(response.status, 404) << target;
    EXPECT_EQ(response.content_type, "application/json") << target;
    EXPECT_EQ(Header(response, "Cache-Control"), "") << target;
  }
}

TEST_F(ConsoleTest, SendsTheCodingThatTheClientAccepts) {
  const Console console(sandbox_.File("page"));
  const struct {
    const char* accepted;
    const char* body;
    const char* coding;
  } cases[] = {
      {"gzip, deflate, br", "code, packed", "gzip"},
      {"x-gzip", "code, packed", "gzip"},
      {"*", "code, packed", "gzip"},
      {"gzip;q=0, *", "code", ""},
      {"br", "code", ""},
      {"", "code", ""},
  };
  for (const auto& c : cases) {
    const Response response = console.Get(Wants("/assets/main-1a2b.js", c.accepted));
    EXPECT_EQ(Body(response), c.body) << c.accepted;
    EXPECT_EQ(Header(response, "Content-Encoding"), c.coding) << c.accepted;
    EXPECT_EQ(Header(response, "Vary"), "Accept-Encoding") << c.accepted;
  }
  EXPECT_EQ(Body(console.Get(Wants("/theme.js", "gzip"))), "theme") << "there is no compressed form";
  EXPECT_EQ(Header(console.Get(Wants("/theme.js", "gzip")), "Content-Encoding"), "");
}

TEST_F(ConsoleTest, GivesEachRepresentationATagOfItsOwn) {
  const Console console(sandbox_.File("page"));
  const std::string plain = Header(console.Get(Wants("/")), "ETag");
  const std::string packed = Header(console.Get(Wants("/", "gzip")), "ETag");
  EXPECT_THAT(plain, testing::MatchesRegex("\"[A-Za-z0-9+/=]+\""));
  EXPECT_NE(plain, packed);
  EXPECT_NE(plain, Header(console.Get(Wants("/theme.js")), "ETag"));
  sandbox_.Write("page/index.html", "another page");
  EXPECT_NE(Header(Console(sandbox_.File("page")).Get(Wants("/")), "ETag"), plain);
}

TEST_F(ConsoleTest, KeepsAssetsForeverAndAsksForThePage) {
  const Console console(sandbox_.File("page"));
  EXPECT_EQ(Header(console.Get(Wants("/assets/main-1a2b.js")), "Cache-Control"), "public, max-age=31536000, immutable");
  EXPECT_EQ(Header(console.Get(Wants("/")), "Cache-Control"), "no-cache");
  EXPECT_EQ(Header(console.Get(Wants("/theme.js")), "Cache-Control"), "no-cache") << "its name has no digest";
}

TEST_F(ConsoleTest, LetsNothingForeignIn) {
  const Console console(sandbox_.File("page"));
  for (const char* target : {"/", "/assets/main-1a2b.js"}) {
    const Response response = console.Get(Wants(target));
    const std::string policy = Header(response, "Content-Security-Policy");
    for (const char* directive :
         {"default-src 'none';", "script-src 'self';", "style-src 'self';", "connect-src 'self';", "base-uri 'none';",
          "frame-ancestors 'none';", "require-trusted-types-for 'script';", "trusted-types 'none'"}) {
      EXPECT_THAT(policy, HasSubstr(directive)) << target;
    }
    EXPECT_THAT(policy, Not(HasSubstr("unsafe"))) << target;
    EXPECT_EQ(Header(response, "Referrer-Policy"), "no-referrer") << target;
    EXPECT_EQ(Header(response, "Cross-Origin-Resource-Policy"), "same-origin") << target;
  }
}

TEST_F(ConsoleTest, MayBeMissing) {
  for (const Console& console : {Console(), Console(sandbox_.File("nowhere"))}) {
    EXPECT_FALSE(console.Owns("/"));
    EXPECT_EQ(console.Get(Wants("/assets/main-1a2b.js")).status, 404);
  }
}

TEST_F(ConsoleTest, LeavesOutWhatCannotBeRead) {
  if (geteuid() == 0) GTEST_SKIP() << "root can read every file";
  std::filesystem::permissions(sandbox_.File("page/theme.js"), std::filesystem::perms::none);
  const Console console(sandbox_.File("page"));
  EXPECT_FALSE(console.Owns("/theme.js"));
  EXPECT_TRUE(console.Owns("/"));
}

// The console of the build, served by vornd.
class ServedConsole : public testing::Test {
 protected:
  ~ServedConsole() override {
    server_.Signal(SIGTERM);
    EXPECT_EQ(server_.Wait(), 0) << server_.log();
  }
  Reply Send(const std::string& request) {
    Connection client = server_.ConnectTcp();
    client.Send(request);
    return client.Receive(request.substr(0, 4) == "HEAD");
  }
  std::string Asset() {
    const std::string page = Send(Get("/")).body;
    const std::size_t begin = page.find("/assets/");
    return begin == std::string::npos ? "" : page.substr(begin, page.find('"', begin) - begin);
  }

  Sandbox sandbox_;
  ServerProcess server_{sandbox_};
};

TEST_F(ServedConsole, NeedsNoCredentials) {
  Reply page = Send(Get("/"));
  EXPECT_EQ(page.status, 200);
  EXPECT_EQ(page.headers["Content-Type"], "text/html; charset=utf-8");
  EXPECT_EQ(page.headers["X-Content-Type-Options"], "nosniff");
  EXPECT_THAT(page.body, HasSubstr("<div id=\"root\">"));
  Reply asset = Send(Get(Asset()));
  EXPECT_EQ(asset.status, 200) << Asset();
  EXPECT_THAT(asset.headers["Cache-Control"], HasSubstr("immutable"));
  EXPECT_EQ(Send(Get("/assets/nothing.js")).status, 404);
  EXPECT_EQ(Send(Get("/assets/../../../../etc/passwd")).status, 404);
  EXPECT_EQ(Send(Get("/nothing")).status, 401);
}

TEST_F(ServedConsole, AnswersHeadAndRevalidation) {
  const std::string asset = Asset();
  const Reply whole = Send(Get(asset, "Accept-Encoding: gzip\r\n"));
  EXPECT_EQ(whole.headers.at("Content-Encoding"), "gzip");
  Reply head = Send("HEAD " + asset + " HTTP/1.1\r\nHost: localhost\r\nAccept-Encoding: gzip\r\n\r\n");
  EXPECT_EQ(head.status, 200);
  EXPECT_EQ(head.body, "");
  EXPECT_EQ(head.headers["Content-Length"], std::to_string(whole.body.size()));
  const std::string known = "Accept-Encoding: gzip\r\nIf-None-Match: " + head.headers["ETag"] + "\r\n";
  Reply same = Send(Get(asset, known));
  EXPECT_EQ(same.status, 304);
  EXPECT_EQ(same.body, "");
  EXPECT_EQ(Send(Get(asset, "If-None-Match: " + head.headers["ETag"] + "\r\n")).status, 200) << "of another coding";
  EXPECT_EQ(Send(Get("/", "Accept-Encoding: gzip\r\n")).headers.count("Content-Encoding"), 0U) << "it is small";
}

TEST_F(ServedConsole, IsReadOnly) {
  Reply post = Send(Post("/"));
  EXPECT_EQ(post.status, 405);
  EXPECT_EQ(post.headers["Allow"], "GET, HEAD");
  EXPECT_EQ(Send(Get("/?a=1")).status, 400);
}

TEST_F(ServedConsole, MayBeTheTargetOfALink) {
  const std::string other = "Sec-Fetch-Site: cross-site\r\n";
  EXPECT_EQ(Send(Get("/", other + "Sec-Fetch-Mode: navigate\r\n")).status, 200);
  EXPECT_EQ(Send(Get("/", other + "Sec-Fetch-Mode: no-cors\r\n")).status, 403);
  EXPECT_EQ(Send(Get(Asset(), other + "Sec-Fetch-Mode: navigate\r\n")).status, 403);
  EXPECT_EQ(Send(Get("/api", other + "Sec-Fetch-Mode: navigate\r\n")).status, 403);
}

}  // namespace
}  // namespace vorn::server
