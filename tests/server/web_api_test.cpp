#include "web_api.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <future>
#include <memory>

#include "body.h"
#include "call.h"
#include "form_body.h"
#include "sandbox.h"
#include "server_methods.h"

namespace vorn::server {
namespace {

void Nothing(VORN::APIRequest* /*request*/, VORN::APIResponse* response) { response->SetSuccess({}); }

void Who(VORN::APIRequest* /*request*/, VORN::APIResponse* response) {
  const VORN::CallDescription& call = VORN::CallContext::Current()->description();
  response->SetSuccess(call.caller + " at " + call.origin);
}

std::shared_future<void> release;  // the end of Hold
void Hold(VORN::APIRequest* /*request*/, VORN::APIResponse* response) {
  release.wait();
  response->SetSuccess({});
}

class WebApiTest : public testing::Test {
 protected:
  static Head Post(std::string_view target) {
    Head head;
    head.method = "POST";
    head.target = target;
    head.host = "localhost";
    head.peer.credentials = Peer::Credentials{1, 0, 0};  // at a Unix socket
    return head;
  }
  static Head PostJson(std::string_view type, std::uint64_t length = 2) {
    return PostBody("/api/Nfs/v1/get", type, length);
  }
  static Head PostBody(std::string_view target, std::string_view type, std::uint64_t length = 2) {
    Head head = Post(target);
    head.has_body = true;
    head.content_type = type;
    head.content_length = length;
    return head;
  }
  // Returns the status of the answer; 0 if the request is accepted and the call runs.
  int Begin(const Head& head) {
    const auto begun = api_.Begin(head);
    return std::holds_alternative<Response>(begun) ? std::get<Response>(begun).status : 0;
  }

  // A pool in which one call of a method runs and two wait.
  static WorkerPool::Limits FewOfALane() {
    WorkerPool::Limits limits;
    limits.lane_threads = 1;
    limits.lane_queue = 2;
    return limits;
  }

  static Descriptor ParseDescriptor() {
    std::string error;
    return *Descriptor::Parse(
        R"({"paths": {"/api/Nfs/v1/read": {"post": {"x-read-only": true}},
                      "/api/Nfs/v1/put": {"post": {"requestBody": {"content": {"multipart/form-data": {}}}}}}})",
        &error);
  }

  std::vector<Module> modules_{{"a.so",
                                {{"Nfs", 1, "get", Nothing},
                                 {"Nfs", 1, "read", Nothing},
                                 {"Nfs", 1, "put", Nothing},
                                 {"Nfs", 1, "who", Who},
                                 {"Nfs", 1, "hold", Hold}},
                                ParseDescriptor()}};
  Routes routes_{modules_};
  Budget memory_{std::size_t{1} << 30, std::size_t{1} << 30};
  Sandbox sandbox_;
  std::string error_;
  std::optional<UploadFolder> uploads_ = UploadFolder::Open(sandbox_.File("uploads"), &error_);
  const OwnNames names_{{"nas.example"}};
  CallMetrics metrics_;
  std::promise<void> release_metrics_;
  const std::vector<MetricsSource> figures_{[released = release_metrics_.get_future().share()] {
    released.wait();
    return std::vector<VORN::Metric>();
  }};
  const AuditSink audit_ = [](const AuditRecord& /*record*/) {};
  TokenStore tokens_{sandbox_.File("tokens.json")};
  Sessions sessions_{Sessions::Limits{}};
  PasswordChecker passwords_{{"/bin/false"}, PasswordChecker::Limits{}};
  const Authenticator authenticator_{tokens_, sessions_, {}};
  const Console console_;
  Workers workers_{FewOfALane()};  // end before what their calls use
  WebApi api_{{routes_,
               *uploads_,
               workers_,
               memory_,
               names_,
               audit_,
               metrics_,
               figures_,
               authenticator_,
               {sessions_, passwords_},
               console_}};
};

TEST_F(WebApiTest, CallsAMethodByPost) {
  EXPECT_EQ(Begin(Post("/api/Nfs/v1/get")), 0);
  EXPECT_EQ(Begin(PostJson("application/json")), 0);
  EXPECT_EQ(Begin(PostJson("Application/JSON; charset=utf-8")), 0);
}

TEST_F(WebApiTest, RefusesAConditionThatItCannotCheck) {
  Head head = Post("/api/Nfs/v1/put");
  head.headers.emplace_back("if-match", "*");
  EXPECT_EQ(Begin(head), 400);
}

TEST_F(WebApiTest, RefusesOtherHttpMethodsAndSaysWhichIsAllowed) {
  Head head = Post("/api/Nfs/v1/get");
  for (const char* method : {"GET", "PUT", "DELETE", "post", "BREW"}) {
    head.method = method;
    const auto begun = api_.Begin(head);
    ASSERT_TRUE(std::holds_alternative<Response>(begun)) << method;
    EXPECT_EQ(std::get<Response>(begun).status, 405) << method;
    ASSERT_EQ(std::get<Response>(begun).headers.size(), 1U);
    EXPECT_EQ(std::get<Response>(begun).headers[0], (std::pair<std::string, std::string>("Allow", "POST")));
  }
}

TEST_F(WebApiTest, HasPagesForGet) {
  for (const char* target : {"/api", "/openapi.json", "/docs", "/docs.css", "/healthz", "/healthz/live"}) {
    Head head = Post(target);
    EXPECT_EQ(Begin(head), 405) << target;
    head.method = "GET";
    EXPECT_EQ(Begin(head), 200) << target;
    head.method = "HEAD";
    EXPECT_EQ(Begin(head), 200) << target;
  }
}

TEST_F(WebApiTest, IsReadyWhenAWorkerIsFree) {
  Head head = Post("/healthz/ready");
  EXPECT_EQ(Begin(head), 405);
  head.method = "GET";
  const auto ask = [&] {
    auto begun = api_.Begin(head);
    const auto status = std::make_shared<std::promise<int>>();  // set_value() may return after the waiter has gone on
    std::get<std::shared_ptr<Exchange>>(begun)->Run(
        [status](const Response& answer) { status->set_value(answer.status); });
    return status->get_future().get();
  };
  EXPECT_EQ(ask(), 200);
  workers_.changing.Close();
  EXPECT_EQ(ask(), 200) << "changing methods have other threads";
  workers_.reading.Close();
  EXPECT_EQ(ask(), 503);
}

TEST_F(WebApiTest, IsReadyWhileMetricsHang) {
  const std::string secret =
      sessions_.Begin("alice", Role::kAdministrator, "", Sessions::Carrier::kBearer, Sessions::Clock::now());
  const auto ask = [&](const char* target) {
    Head head = Post(target);
    head.method = "GET";
    const std::string credentials = "Bearer " + secret;
    head.headers.emplace_back("authorization", credentials);
    auto begun = api_.Begin(head);
    const auto status = std::make_shared<std::promise<int>>();
    std::get<std::shared_ptr<Exchange>>(begun)->Run(
        [status](const Response& answer) { status->set_value(answer.status); });
    return status->get_future();
  };
  std::vector<std::future<int>> hanging;
  for (int i = 0; i < 2; ++i) hanging.push_back(ask("/metrics"));  // one page runs at a time
  EXPECT_EQ(ask("/healthz/ready").get(), 200);
  release_metrics_.set_value();
  for (std::future<int>& each : hanging) EXPECT_EQ(each.get(), 200);
}

TEST_F(WebApiTest, OptionsNamesTheAllowedMethods) {
  const struct {
    const char* target;
    const char* allowed;
  } cases[] = {{"/api/Nfs/v1/get", "POST, OPTIONS"}, {"/api", "GET, HEAD, OPTIONS"}, {"*", "GET, HEAD, POST, OPTIONS"}};
  for (const auto& c : cases) {
    Head head = Post(c.target);
    head.method = "OPTIONS";
    const auto begun = api_.Begin(head);
    ASSERT_TRUE(std::holds_alternative<Response>(begun)) << c.target;
    EXPECT_EQ(std::get<Response>(begun).status, 204) << c.target;
    ASSERT_EQ(std::get<Response>(begun).headers.size(), 1U);
    EXPECT_EQ(std::get<Response>(begun).headers[0], (std::pair<std::string, std::string>("Allow", c.allowed)));
  }
}

TEST_F(WebApiTest, RehearsesOnlyMethodsThatChangeSomething) {
  const struct {
    const char* target;
    const char* query;
    int status;
  } cases[] = {{"/api/Nfs/v1/put", "rehearse=true", 0},
               {"/api/Nfs/v1/put", "rehearse=false", 400},
               {"/api/Nfs/v1/put", "rehearse", 400},
               {"/api/Nfs/v1/put", "rehearse=", 400},
               {"/api/Nfs/v1/put", "rehearse=TRUE", 400},
               {"/api/Nfs/v1/put", "rehearse=true&rehearse=true", 400},
               {"/api/Nfs/v1/put", "rehearse=true&x=1", 400},
               {"/api/Nfs/v1/put", "Rehearse=true", 400},
               {"/api/Nfs/v1/put", "rehearse=%74rue", 400},
               {"/api/Nfs/v1/read", "rehearse=true", 400},
               {"/api", "rehearse=true", 405}};
  for (const auto& c : cases) {
    Head head = Post(c.target);
    head.query = c.query;
    EXPECT_EQ(Begin(head), c.status) << c.target << "?" << c.query;
  }
  AddServerMethods(tokens_, sessions_, &routes_);
  for (const char* target : {"/api/VORN.Server.Token/v1/create", "/api/VORN.Server.Session/v1/sign_in"}) {
    Head head = PostBody(target, "application/json");
    head.query = "rehearse=true";
    EXPECT_EQ(Begin(head), 400) << target;
  }
}

TEST_F(WebApiTest, UnknownQueryParametersAreRefusedByName) {
  for (const char* target : {"/api/Nfs/v1/get", "/api"}) {
    Head head = Post(target);
    if (head.target == "/api") head.method = "GET";
    head.query = "verbose=1&x";
    const auto begun = api_.Begin(head);
    ASSERT_TRUE(std::holds_alternative<Response>(begun)) << target;
    EXPECT_EQ(std::get<Response>(begun).status, 400) << target;
    EXPECT_NE(std::get<Response>(begun).body.find("verbose"), std::string::npos) << target;
  }
  Head unknown = Post("/nowhere");
  unknown.query = "verbose=1";
  EXPECT_EQ(Begin(unknown), 404);
}

TEST_F(WebApiTest, UnchangingPagesHaveAVersion) {
  for (const char* target : {"/api", "/openapi.json", "/docs", "/docs.css"}) {
    Head head = Post(target);
    head.method = "GET";
    const auto first = std::get<Response>(api_.Begin(head));
    const auto is_tag = [](const auto& header) { return header.first == "ETag"; };
    EXPECT_EQ(std::count_if(first.headers.begin(), first.headers.end(), is_tag), 1) << target;
    EXPECT_EQ(first.headers, std::get<Response>(api_.Begin(head)).headers) << target;
  }
}

TEST_F(WebApiTest, TheDocumentationLoadsNothingButItsStyle) {
  Head head = Post("/docs");
  head.method = "GET";
  const auto page = std::get<Response>(api_.Begin(head));
  EXPECT_EQ(page.content_type, "text/html; charset=utf-8");
  ASSERT_FALSE(page.headers.empty());
  EXPECT_EQ(page.headers[0].first, "Content-Security-Policy");
  EXPECT_EQ(page.headers[0].second.find("default-src 'none'; style-src 'self';"), 0U) << page.headers[0].second;
}

TEST_F(WebApiTest, AnswersOtherTargetsWith404) {
  for (const char* target : {"/", "/api/Nfs/v1/set", "/api/Nfs/v2/get", "/api/Smb/v1/get", "/healthz/", "/API"}) {
    EXPECT_EQ(Begin(Post(target)), 404) << target;
  }
}

TEST_F(WebApiTest, TakesJsonOnly) {
  for (const char* type : {"", "text/plain", "application/x-www-form-urlencoded", "application/jsonx",
                           "text/plain; x=application/json", "application/json; charset"}) {
    EXPECT_EQ(Begin(PostJson(type)), 415) << type;
  }
}

TEST_F(WebApiTest, TakesFormsWithAProperBoundary) {
  const auto form = [this](const char* type, std::uint64_t length) {
    return Begin(PostBody("/api/Nfs/v1/put", type, length));
  };
  EXPECT_EQ(form("multipart/form-data; boundary=x", FormBody::kMaxBytes), 0);
  EXPECT_EQ(form("multipart/form-data; boundary=x", FormBody::kMaxBytes + 1), 413);
  for (const char* type : {"multipart/form-data", "multipart/form-data; boundary=",
                           "multipart/form-data; boundary=\"\"", "multipart/form-data; boundary=\"a\\\"b\""}) {
    EXPECT_GE(form(type, 2), 400) << type;
  }
}

TEST_F(WebApiTest, TakesFormsOnlyForMethodsThatTakeAFile) {
  EXPECT_EQ(Begin(PostBody("/api/Nfs/v1/get", "multipart/form-data; boundary=x")), 415);
}

TEST_F(WebApiTest, RefusesALargeBodyBeforeItComes) {
  EXPECT_EQ(Begin(PostJson("application/json", JsonBody::kMaxBytes)), 0);
  EXPECT_EQ(Begin(PostJson("application/json", JsonBody::kMaxBytes + 1)), 413);
}

TEST_F(WebApiTest, BehindAProxyOnlyItsOwnNamesAreServed) {
  Head head = Post("/api/Nfs/v1/get");
  for (const char* host : {"nas.example.", "nas.example:x", "nas.example:123456", "evil.example", ""}) {
    head.host = host;
    EXPECT_EQ(Begin(head), 421) << host;
  }
  head.host = std::nullopt;
  EXPECT_EQ(Begin(head), 421);
}

TEST_F(WebApiTest, OverTcpOnlyItsOwnNamesAreServed) {
  Head head = Post("/api/Nfs/v1/get");
  head.host = "evil.example";
  head.peer = {"127.0.0.1", true, std::nullopt};
  EXPECT_EQ(Begin(head), 421);
  head.host = std::nullopt;
  EXPECT_EQ(Begin(head), 421);
  for (const char* host : {"localhost:8080", "nas.example"}) {
    head.host = host;
    EXPECT_EQ(Begin(head), 401) << host;
  }
}

TEST_F(WebApiTest, PagesOfOtherSitesAndPortsAreKeptOut) {
  Head head = Post("/api/Nfs/v1/get");
  head.host = "localhost:8080";
  head.headers = {{"origin", "http://localhost:8080"}};
  EXPECT_EQ(Begin(head), 0);
  for (const char* origin : {"http://localhost:3000", "http://evil.example", "null", ""}) {
    head.headers = {{"origin", origin}};
    EXPECT_EQ(Begin(head), 403) << origin;
  }
  head.host = "nas.example";
  head.headers = {{"origin", "https://nas.example"}};
  EXPECT_EQ(Begin(head), 401) << "the peer is a proxy";
}

TEST_F(WebApiTest, RequestsThatABrowserMakesForOtherSitesAreRefused) {
  Head head = Post("/api/Nfs/v1/get");
  const struct {
    const char* site;
    int status;
  } cases[] = {{"same-origin", 0}, {"none", 0}, {"same-site", 403}, {"cross-site", 403}};
  for (const auto& c : cases) {
    head.headers = {{"sec-fetch-site", c.site}};
    EXPECT_EQ(Begin(head), c.status) << c.site;
  }
}

TEST_F(WebApiTest, TakesParametersInUtf8Only) {
  for (const char* charset : {"UTF-8", "utf-8", "\"utf-8\""}) {
    EXPECT_EQ(Begin(PostJson("application/json; charset=" + std::string(charset))), 0) << charset;
  }
  for (const char* charset : {"iso-8859-1", "utf-16", "\"\""}) {
    EXPECT_EQ(Begin(PostJson("application/json; charset=" + std::string(charset))), 415) << charset;
  }
}

TEST_F(WebApiTest, CallsOfAFewProcessesLeaveRoomToOthers) {
  std::promise<void> end;
  release = end.get_future().share();
  const auto call = [this](pid_t pid, unsigned recent_requests) {
    Head head = Post("/api/Nfs/v1/hold");
    head.peer.credentials->pid = pid;
    head.recent_requests = recent_requests;
    auto begun = api_.Begin(head);
    const auto status = std::make_shared<std::promise<int>>();
    std::get<std::shared_ptr<Exchange>>(begun)->Run(
        [status](const Response& answer) { status->set_value(answer.status); });
    api_.Dispatch();
    return status->get_future();
  };
  auto running = call(1, 0);
  ASSERT_TRUE(Eventually([this] { return workers_.changing.load().running == 1; }));
  auto first = call(1, 0);
  auto busy = call(1, 1);
  auto second = call(1, 0);
  EXPECT_EQ(busy.get(), 503) << "its connection has sent most requests";
  auto other = call(2, 9);
  EXPECT_EQ(second.get(), 503) << "its process has most calls";
  end.set_value();
  EXPECT_EQ(running.get(), 200);
  EXPECT_EQ(first.get(), 200);
  EXPECT_EQ(other.get(), 200);
}

TEST_F(WebApiTest, TellsTheCallWhoHasSentIt) {
  const Head head = Post("/api/Nfs/v1/who");
  auto begun = api_.Begin(head);
  // Shared, because the worker may still be in set_value() when the future is ready.
  const auto answer = std::make_shared<std::promise<std::string>>();
  std::get<std::shared_ptr<Exchange>>(begun)->Run(
      [answer](const Response& response) { answer->set_value(response.body); });
  api_.Dispatch();
  EXPECT_EQ(answer->get_future().get(), R"({"success":true,"data":"uid 0 at unix"})");
}

}  // namespace
}  // namespace vorn::server
