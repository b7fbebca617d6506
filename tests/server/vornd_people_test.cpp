// Authentication and authorisation by the real vornd and its helper program, on a trial root with accounts of its own.
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <memory>
#include <regex>
#include <utility>
#include <vector>

#include "answer.h"
#include "json_input.h"
#include "server_process.h"

namespace vorn::server {
namespace {

using std::chrono::milliseconds;
using std::chrono::steady_clock;
using testing::HasSubstr;

constexpr const char* kEcho = "/api/Test.Echo/v1/";
constexpr const char* kSession = "/api/VORN.Server.Session/v1/";
constexpr const char* kToken = "/api/VORN.Server.Token/v1/";
constexpr const char* kSecureHost = "nas.example";  // of a proxy with TLS

// Records the answer of a method of the server itself, as tests/support/recorded_answers.h says, so that it can be
// compared with the descriptor after the tests. Returns the reply.
Reply Recorded(const std::string& path, const std::string& json, Reply reply) {
  const char* const folder = std::getenv("VORN_RECORD_ANSWERS");
  if (folder == nullptr || path.rfind("/api/VORN.Server.", 0) != 0 || reply.status == 0) return reply;
  static std::ofstream file(std::string(folder) + "/" + program_invocation_short_name + ".jsonl");
  const Json::Value envelope = reply.Envelope();
  std::string error;
  Json::Value line;
  const std::size_t begin = std::string("/api/").size();
  line["method"] = path.substr(begin, path.find('?') - begin);
  line["request"] = ParseJsonObject(json, &error).value_or(Json::Value());
  line["code"] = reply.status == 200 ? Json::Value(0) : envelope["error"]["code"];
  line["data"] = reply.status == 200 ? envelope["data"] : envelope["error"]["details"];
  line["kerberos"] = true;
  file << WriteJson(line) << std::endl;
  return reply;
}

// Returns the number of a child process; an empty string if there is none.
std::string ChildOf(pid_t pid) {
  std::string child;
  const std::filesystem::path tasks = "/proc/" + std::to_string(pid) + "/task";
  for (const auto& task : std::filesystem::directory_iterator(tasks)) {
    if (std::ifstream(task.path() / "children") >> child) break;
  }
  return child;
}

class People : public testing::Test {
 protected:
  enum class Way { kUnix, kTcp };

  People() {
    for (const char* folder : {"etc/pam.d"}) std::filesystem::create_directories(sandbox_.File(folder));
    sandbox_.Write("etc/pam.d/vornd", "auth required " PAM_MODULE "\naccount required " PAM_MODULE "\n");
    sandbox_.Write("etc/passwd",
                   "alice:x:1001:100::/:/bin/sh\nbob:x:1002:100::/:/bin/sh\ncarol:x:1003:100::/:/bin/sh\n"
                   "expired:x:1004:3001::/:/bin/sh\n");
    std::filesystem::create_directories(sandbox_.File("etc/vorn"));
    sandbox_.Write("etc/vorn/vornd.conf", "[access]\npassword-time = 1s\n");  // for the modules that hang
    sandbox_.Write("etc/group", "users:x:100:\nvorn-admin:x:3001:alice\nvorn-readonly:x:3002:bob\n");
    Start();
  }

  void Start() {
    server_.reset();
    server_ = std::make_unique<ServerProcess>(
        sandbox_, std::vector<std::string>{"--host-name", kSecureHost, "--listen", "127.0.0.1:0", "--listen",
                                           "unix:" + sandbox_.File("run/vorn/vornd.sock")});
    ASSERT_TRUE(server_->ready()) << server_->log();
  }

  void Stop() {
    server_->Signal(SIGTERM);
    EXPECT_EQ(server_->Wait(), 0) << server_->log();
  }

  Connection ConnectBy(Way way) const { return way == Way::kUnix ? server_->Connect() : server_->ConnectTcp(); }

  Reply Call(Way way, const std::string& path, const std::string& json = "{}", const std::string& headers = "") const {
    Connection client = ConnectBy(way);
    client.Send(Post(path, json, headers));
    return Recorded(path, json, client.Receive());
  }

  // A call of the local administrator.
  Reply Administer(const std::string& path, const std::string& json = "{}") const {
    return Call(Way::kUnix, path, json);
  }

  std::string MetricsPage() const {
    Connection client = server_->Connect();
    client.Send(Get("/metrics"));
    return client.Receive().body;
  }

  // Makes a token; `more` has further members of the parameters.
  std::string NewToken(const std::string& name, const std::string& role, const std::string& more = "") const {
    const Reply reply = Administer(std::string(kToken) + "create",
                                   R"({"name": ")" + name + R"(", "role": ")" + role + "\"" + more + "}");
    EXPECT_EQ(reply.status, 200) << reply.body;
    return reply.Envelope()["data"]["token"].asString();
  }

  static std::string Credentials(const std::string& account, const std::string& password) {
    return R"({"account": ")" + account + R"(", "password": ")" + password + "\"}";
  }

  Reply SignIn(const std::string& account, const std::string& password, Way way = Way::kTcp) const {
    return Call(way, std::string(kSession) + "sign_in", Credentials(account, password));
  }

  // Signs in with the right password and returns the header with the session.
  std::string SignedIn(const std::string& account) const {
    const Reply reply = SignIn(account, kPasswordMark + account);
    EXPECT_EQ(reply.status, 200) << reply.body;
    return BearerHeader(reply.Envelope()["data"]["token"].asString());
  }

  // A request as a proxy with TLS forwards it. Returns the reply.
  Reply CallSecurely(const std::string& path, const std::string& json, const std::string& headers = "") const {
    Connection client = server_->ConnectTcp();
    client.Send("POST " + path + " HTTP/1.1\r\nHost: " + kSecureHost + "\r\nContent-Type: application/json\r\n" +
                headers + "Content-Length: " + std::to_string(json.size()) + "\r\n\r\n" + json);
    return Recorded(path, json, client.Receive());
  }

  Sandbox sandbox_;
  std::unique_ptr<ServerProcess> server_;
};

const std::string kGet = std::string(kEcho) + "get";          // only reads
const std::string kContext = std::string(kEcho) + "context";  // may change something

TEST_F(People, WithoutCredentialsReachOnlyTheHealthChecksOverLoopback) {
  for (const std::string& path : {kGet, kContext, std::string("/api/No.Such/v1/get"), std::string(kToken) + "list"}) {
    const Reply reply = Call(Way::kTcp, path);
    EXPECT_EQ(reply.status, 401) << path;
    EXPECT_EQ(reply.headers.at("WWW-Authenticate"), "Bearer");
  }
  Connection client = server_->ConnectTcp();
  const std::pair<const char*, int> pages[] = {{"/api", 401}, {"/healthz", 200}, {"/healthz/ready", 200}};
  for (const auto& [page, status] : pages) {
    client.Send(Get(page));
    EXPECT_EQ(client.Receive().status, status) << page;
  }
}

TEST_F(People, AreRefusedBeforeTheirBodyIsRead) {
  Connection client = server_->ConnectTcp();
  client.Send("POST " + kGet +
              " HTTP/1.1\r\nHost: localhost\r\nContent-Type: application/json\r\nContent-Length: 1000000\r\n"
              "Expect: 100-continue\r\n\r\n");
  EXPECT_EQ(client.Receive().status, 401);
}

TEST_F(People, AtTheUnixSocketAreAdministratorsIfTheyAreRoot) {
  const Reply reply = Administer(kContext);
  EXPECT_EQ(reply.status, 200);
  EXPECT_EQ(reply.Envelope()["data"]["caller"], "uid " + std::to_string(geteuid()));
  EXPECT_EQ(reply.Envelope()["data"]["may_write"], true);
  EXPECT_TRUE(Administer(std::string(kSession) + "get").Envelope()["data"]["session"].isNull());
}

// Other users can connect, and need a token as everybody else.
TEST_F(People, AtTheUnixSocketWithoutRightsNeedAToken) {
  if (geteuid() != 0) GTEST_SKIP() << "only root can become another user";
  ASSERT_EQ(chmod(sandbox_.path().c_str(), 0755), 0);
  const pid_t child = fork();
  if (child == 0) {
    if (setgid(40000) != 0 || setuid(40000) != 0) _exit(1);
    if (Call(Way::kUnix, kGet).status != 401) _exit(2);
    _exit(Call(Way::kUnix, kGet, "{}", ServerProcess::TokenHeader()).status == 200 ? 0 : 3);
  }
  int status = 0;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  // setgroups(2) was not called: the child has root's groups, none of which is the administrators'.
  EXPECT_EQ(WEXITSTATUS(status), 0);
}

TEST_F(People, TokensOfReadersCallOnlyMethodsThatRead) {
  const std::string header = BearerHeader(NewToken("monitor", "reader"));
  for (const Way way : {Way::kUnix, Way::kTcp}) {
    EXPECT_EQ(Call(way, kGet, "{}", header).status, 200);
    EXPECT_EQ(Call(way, "/api/Test.Echo/v2/context", "{}", header).Envelope()["data"]["may_write"], false);
    EXPECT_EQ(Call(way, kContext, "{}", header).status, 403);
    EXPECT_EQ(Call(way, std::string(kToken) + "list", "{}", header).status, 403);
    EXPECT_EQ(Call(way, std::string(kSession) + "list", "{}", header).status, 403);
  }
}

TEST_F(People, ReadersMayRehearse) {
  const std::string header = BearerHeader(NewToken("monitor", "reader"));
  const Reply reply = Call(Way::kTcp, kContext + "?rehearse=true", "{}", header);
  EXPECT_EQ(reply.status, 200) << reply.body;
  EXPECT_EQ(reply.Envelope()["data"]["may_write"], true) << "to a draft";
  EXPECT_TRUE(reply.Envelope()["rehearsal"]["files"].isArray()) << reply.body;
  EXPECT_EQ(Call(Way::kTcp, kGet + "?rehearse=true", "{}", header).status, 400);
  EXPECT_EQ(Call(Way::kTcp, kContext + "?rehearse=yes", "{}", header).status, 400);
  EXPECT_EQ(Call(Way::kTcp, std::string(kToken) + "create?rehearse=true", "{}", header).status, 400);
  EXPECT_THAT(server_->log(),
              testing::ContainsRegex("rehearsal: .*monitor 127.0.0.1 Test.Echo/v1/context .* succeeded"));
  EXPECT_THAT(server_->log(), testing::Not(testing::ContainsRegex("audit: token monitor")));
  EXPECT_FALSE(Administer(kContext).Envelope().isMember("rehearsal"));
}

TEST_F(People, LimitsOfATokenHoldForRehearsals) {
  const std::string header = BearerHeader(NewToken("music", "administrator", R"(, "shares": ["music"])"));
  EXPECT_EQ(Call(Way::kTcp, kContext + "?rehearse=true", "{}", header).status, 403);
}

TEST_F(People, ChangingCallsOfReadersDoNotBegin) {
  const std::string header = BearerHeader(NewToken("monitor", "reader"));
  const std::string begun = sandbox_.File("begun");
  EXPECT_EQ(
      Call(Way::kTcp, std::string(kEcho) + "wait", R"({"begun": ")" + begun + R"(", "release": "/dev/null"})", header)
          .status,
      403);
  EXPECT_FALSE(std::filesystem::exists(begun));
}

TEST_F(People, TokensOfAdministratorsDoEverything) {
  const std::string header = BearerHeader(NewToken("automation", "administrator"));
  for (const Way way : {Way::kUnix, Way::kTcp}) {
    const Reply reply = Call(way, kContext, "{}", header);
    EXPECT_EQ(reply.Envelope()["data"]["caller"], "token automation");
    EXPECT_EQ(reply.Envelope()["data"]["may_write"], true);
    EXPECT_EQ(Call(way, std::string(kToken) + "list", "{}", header).status, 200);
  }
}

TEST_F(People, TokensOfSomeApisCallNoOthers) {
  const std::string header = BearerHeader(NewToken("echo", "administrator", R"(, "apis": ["Test.Echo"])"));
  EXPECT_EQ(Call(Way::kTcp, kContext, "{}", header).status, 200);
  EXPECT_EQ(Call(Way::kTcp, std::string(kToken) + "list", "{}", header).status, 403);
}

TEST_F(People, TokensOfSomeSharesNameNoOthers) {
  const std::string header = BearerHeader(NewToken("music", "administrator", R"(, "shares": ["music", "films"])"));
  const std::pair<const char*, int> cases[] = {{R"({"share": "music"})", 200},
                                               {R"({"share": "films"})", 200},
                                               {R"({"share": "data"})", 403},
                                               {R"({"share": "Music"})", 403},
                                               {R"({"share": ["music"]})", 403},
                                               {R"({"share": null})", 403},
                                               {"{}", 403}};
  for (const auto& [json, status] : cases) EXPECT_EQ(Call(Way::kTcp, kGet, json, header).status, status) << json;
  EXPECT_EQ(Call(Way::kTcp, kContext, R"({"share": "music"})", header).status, 403) << "its descriptor names no share";
  EXPECT_EQ(Call(Way::kTcp, std::string(kToken) + "list", "{}", header).status, 403);
}

TEST_F(People, RevokedTokensAreStale) {
  const std::string header = BearerHeader(NewToken("backup", "administrator"));
  const Json::Value list = Administer(std::string(kToken) + "list").Envelope()["data"];
  ASSERT_EQ(list.size(), 2U);
  EXPECT_EQ(list[1]["name"], "backup");
  EXPECT_FALSE(list[1].isMember("token"));
  EXPECT_FALSE(list[1].isMember("digest"));
  const std::string id = R"({"id": ")" + list[1]["id"].asString() + "\"}";
  EXPECT_EQ(Call(Way::kTcp, kGet, "{}", header).status, 200);
  EXPECT_EQ(Administer(std::string(kToken) + "revoke", id).status, 200);
  EXPECT_EQ(Administer(std::string(kToken) + "revoke", id).status, 404);
  for (const Way way : {Way::kUnix, Way::kTcp}) EXPECT_EQ(Call(way, kGet, "{}", header).status, 401);
}

TEST_F(People, TokensExpire) {
  const std::string header = BearerHeader(NewToken("short", "reader", R"(, "expires_in": 1)"));
  EXPECT_TRUE(Eventually([&] { return Call(Way::kTcp, kGet, "{}", header).status == 401; }));
}

TEST_F(People, TokensOutliveTheServerAndKnowTheirLastUse) {
  const std::string header = BearerHeader(NewToken("backup", "reader"));
  EXPECT_EQ(Call(Way::kTcp, kGet, "{}", header).status, 200);
  Stop();
  Start();
  const Json::Value token = Administer(std::string(kToken) + "list").Envelope()["data"][1];
  EXPECT_GT(token["last_used"].asInt64(), 0);
  EXPECT_EQ(token["last_address"], "127.0.0.1");
  EXPECT_EQ(Call(Way::kTcp, kGet, "{}", header).status, 200);
  struct stat status {};
  ASSERT_EQ(stat(sandbox_.File("var/lib/vorn/tokens.json").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777, 0600U);
}

TEST_F(People, TokensAreMadeFromWholeParametersOnly) {
  for (const char* json :
       {"{}", R"({"name": "a"})", R"({"name": "", "role": "reader"})", R"({"name": "a\nb", "role": "reader"})",
        R"({"name": "a", "role": "root"})", R"({"name": "a", "role": "reader", "apis": []})",
        R"({"name": "a", "role": "reader", "apis": ["No.Such"]})",
        R"({"name": "a", "role": "reader", "apis": "Test.Echo"})", R"({"name": "a", "role": "reader", "shares": [""]})",
        R"({"name": "a", "role": "reader", "shares": [1]})", R"({"name": "a", "role": "reader", "expires_in": 0})",
        R"({"name": "a", "role": "reader", "expires_in": "1"})",
        R"({"name": "a", "role": "reader", "share": ["data"]})"}) {
    EXPECT_EQ(Administer(std::string(kToken) + "create", json).status, 400) << json;
  }
  EXPECT_EQ(Administer(std::string(kToken) + "create", R"({"name": "test", "role": "reader"})").status, 409);
  EXPECT_EQ(Administer(std::string(kToken) + "list").Envelope()["data"].size(), 1U);
}

TEST_F(People, SignInWithAnAccountOfTheBox) {
  for (const Way way : {Way::kUnix, Way::kTcp}) {
    const Json::Value data = SignIn("alice", std::string(kPasswordMark) + "alice", way).Envelope()["data"];
    EXPECT_EQ(data["account"], "alice");
    EXPECT_EQ(data["role"], "administrator");
    const std::string header = BearerHeader(data["token"].asString());
    EXPECT_EQ(Call(way, kContext, "{}", header).Envelope()["data"]["caller"], "account alice");
    EXPECT_EQ(Call(way, std::string(kSession) + "get", "{}", header).Envelope()["data"]["role"], "administrator");
  }
}

TEST_F(People, OfTheReadersGroupOnlyRead) {
  const std::string header = SignedIn("bob");
  EXPECT_EQ(Call(Way::kTcp, kGet, "{}", header).status, 200);
  EXPECT_EQ(Call(Way::kTcp, kContext, "{}", header).status, 403);
  EXPECT_EQ(Call(Way::kTcp, std::string(kToken) + "create", R"({"name": "a", "role": "reader"})", header).status, 403);
}

TEST_F(People, OfNeitherGroupHaveNoSession) {
  EXPECT_EQ(SignIn("carol", std::string(kPasswordMark) + "carol").status, 403);
  EXPECT_EQ(Administer(std::string(kSession) + "list").Envelope()["data"].size(), 0U);
}

// The module of the test notices an unknown account at once and a wrong password only after 0.3 s.
TEST_F(People, CannotTellAnUnknownAccountFromAWrongPassword) {
  const auto begin = steady_clock::now();
  std::vector<Connection> attempts;
  for (const auto& [account, password] :
       {std::pair("alice", "nobody"), std::pair("ghost", "nobody"), std::pair("expired", "expired")}) {
    attempts.push_back(server_->ConnectTcp());
    attempts.back().Send(
        Post(std::string(kSession) + "sign_in", Credentials(account, std::string(kPasswordMark) + password)));
  }
  const Reply wrong = attempts[0].Receive();
  EXPECT_EQ(wrong.status, 401);
  for (const std::size_t other : {1, 2}) {
    const Reply reply = attempts[other].Receive();
    EXPECT_EQ(std::pair(reply.status, reply.body), std::pair(wrong.status, wrong.body)) << other;
  }
  EXPECT_GE(steady_clock::now() - begin, milliseconds(1000));
}

TEST_F(People, WaitLongerAfterEachWrongPasswordButGetIn) {
  std::vector<Connection> wrong;
  for (int i = 0; i < 3; ++i) {
    wrong.push_back(server_->ConnectTcp());
    wrong.back().Send(Post(std::string(kSession) + "sign_in", Credentials("alice", "wrong")));
  }
  for (Connection& client : wrong) EXPECT_EQ(client.Receive().status, 401);
  const auto begin = steady_clock::now();
  EXPECT_EQ(SignIn("alice", std::string(kPasswordMark) + "alice").status, 200);
  EXPECT_GE(steady_clock::now() - begin, milliseconds(1000));
}

TEST_F(People, AreNotHinderedByAPamModuleThatCrashesOrHangs) {
  Connection hanging = server_->ConnectTcp();
  hanging.Send(Post(std::string(kSession) + "sign_in", Credentials("hang", "x")));
  EXPECT_EQ(SignIn("crash", "x").status, 503);
  EXPECT_EQ(SignIn("alice", std::string(kPasswordMark) + "alice").status, 200);
  EXPECT_EQ(hanging.Receive().status, 503);
  EXPECT_THAT(server_->log(), HasSubstr("its process is killed"));
}

TEST_F(People, AreToldWhenPamIsNotSetUp) {
  std::filesystem::remove(sandbox_.File("etc/pam.d/vornd"));
  EXPECT_EQ(SignIn("alice", std::string(kPasswordMark) + "alice").status, 503);
}

TEST_F(People, CannotSignInWithIncompleteCredentials) {
  for (const char* json : {"{}", R"({"account": "alice"})", R"({"account": "alice", "password": ""})",
                           R"({"account": 1, "password": "x"})", R"({"account": "a\u0000b", "password": "x"})",
                           R"({"account": "alice", "password": "x", "more": 1})", R"({"code": 1})", "{"}) {
    EXPECT_EQ(Call(Way::kTcp, std::string(kSession) + "sign_in", json).status, 400) << json;
  }
  EXPECT_EQ(SignIn("alice", std::string(2000, 'x')).status, 400);
  const std::string null_code =
      R"({"account": "alice", "password": ")" + std::string(kPasswordMark) + R"(alice", "code": null})";
  EXPECT_EQ(Call(Way::kTcp, std::string(kSession) + "sign_in", null_code).status, 200);
  EXPECT_EQ(SignIn("alice", std::string(5000, 'x')).status, 413);
}

// Four attempts on an account from one address wait at the same time, after three that need not wait.
TEST_F(People, WhoTryTooManyPasswordsAtOnceAreToldToTryLater) {
  const std::string sign_in = std::string(kSession) + "sign_in";
  std::vector<Connection> attempts;
  for (int i = 0; i < 8; ++i) {
    attempts.push_back(server_->ConnectTcp());
    attempts.back().Send(Post(sign_in, Credentials("hang", "x")));
  }
  EXPECT_TRUE(Eventually([&] {
    const Reply reply = SignIn("hang", "x");
    return reply.status == 429 && reply.headers.at("Retry-After") == "5";
  }));
}

TEST_F(People, AreRefusedUnknownParameters) {
  const std::string header = SignedIn("alice");
  for (const char* method : {"get", "sign_out", "list", "end"}) {
    EXPECT_EQ(Call(Way::kTcp, std::string(kSession) + method, R"({"more": 1})", header).status, 400) << method;
  }
  for (const char* method : {"create", "list", "revoke"}) {
    EXPECT_EQ(Call(Way::kTcp, std::string(kToken) + method, R"({"more": 1})", header).status, 400) << method;
  }
}

// A folder takes the place of the file, so that the file cannot be replaced.
TEST_F(People, AreToldWhenTokensCannotBeStored) {
  const std::string file = sandbox_.File("var/lib/vorn/tokens.json");
  std::filesystem::remove(file);
  std::filesystem::create_directories(file + "/in the way");
  for (const auto& [method, json] :
       {std::pair("create", R"({"name": "a", "role": "reader"})"), std::pair("revoke", R"({"id": "test"})")}) {
    const Reply reply = Administer(std::string(kToken) + method, json);
    EXPECT_EQ(reply.status, 500) << method;
    EXPECT_EQ(reply.Envelope()["error"]["code"], 2302) << method;
  }
  EXPECT_EQ(Administer(std::string(kToken) + "list").Envelope()["data"].size(), 1U);
}

TEST_F(People, BehindTlsHaveACookie) {
  const std::string sign_in = std::string(kSession) + "sign_in";
  const Reply reply = CallSecurely(sign_in, Credentials("alice", std::string(kPasswordMark) + "alice"));
  ASSERT_EQ(reply.status, 200) << reply.body;
  EXPECT_FALSE(reply.Envelope()["data"].isMember("token"));
  std::smatch cookie;
  const std::string header = reply.headers.at("Set-Cookie");
  ASSERT_TRUE(std::regex_match(header, cookie,
                               std::regex("(__Host-vorn-session=(vorns_[0-9a-f]{72})); Path=/; Secure; HttpOnly; "
                                          "SameSite=Strict")));
  const std::string with_cookie = "Cookie: " + cookie[1].str() + "\r\n";
  EXPECT_EQ(CallSecurely(kContext, "{}", with_cookie).status, 200);
  EXPECT_EQ(CallSecurely(kContext, "{}", with_cookie + "Origin: https://nas.example\r\n").status, 200);
  EXPECT_EQ(CallSecurely(kContext, "{}", with_cookie + "Origin: https://evil.example\r\n").status, 403);
  EXPECT_EQ(CallSecurely(kContext, "{}", with_cookie + "Sec-Fetch-Site: cross-site\r\n").status, 403);
  EXPECT_EQ(Call(Way::kTcp, kContext, "{}", with_cookie).status, 401) << "not without TLS";
  EXPECT_EQ(Call(Way::kTcp, kContext, "{}", BearerHeader(cookie[2])).status, 401) << "a cookie is no token";
  const Reply out = CallSecurely(std::string(kSession) + "sign_out", "{}", with_cookie);
  EXPECT_THAT(out.headers.at("Set-Cookie"), HasSubstr("__Host-vorn-session=;"));
  EXPECT_EQ(CallSecurely(kContext, "{}", with_cookie).status, 401);
}

TEST_F(People, WhoHaveSignedOutAreRefused) {
  const std::string header = SignedIn("bob");
  EXPECT_EQ(Call(Way::kTcp, std::string(kSession) + "sign_out", "{}", header).status, 200);
  EXPECT_EQ(Call(Way::kTcp, kGet, "{}", header).status, 401);
  EXPECT_EQ(Administer(std::string(kSession) + "sign_out").status, 409);
}

TEST_F(People, HaveSessionsThatAnAdministratorEnds) {
  const std::string header = SignedIn("bob");
  const Json::Value list = Administer(std::string(kSession) + "list").Envelope()["data"];
  ASSERT_EQ(list.size(), 1U);
  EXPECT_THAT(MetricsPage(), HasSubstr("\nvorn_sessions 1\n"));
  EXPECT_EQ(list[0]["account"], "bob");
  EXPECT_EQ(list[0]["role"], "reader");
  const std::string id = R"({"id": ")" + list[0]["id"].asString() + "\"}";
  EXPECT_EQ(Call(Way::kTcp, std::string(kSession) + "end", id, header).status, 403) << "bob is no administrator";
  EXPECT_EQ(Administer(std::string(kSession) + "end", id).status, 200);
  EXPECT_EQ(Administer(std::string(kSession) + "end", id).status, 404);
  EXPECT_THAT(MetricsPage(), HasSubstr("\nvorn_sessions 0\n"));
  EXPECT_EQ(Call(Way::kTcp, kGet, "{}", header).status, 401);
}

TEST_F(People, LoseTheirSessionsWhenTheServerEnds) {
  const std::string header = SignedIn("alice");
  EXPECT_EQ(Call(Way::kTcp, kGet, "{}", header).status, 200);
  Stop();
  Start();
  EXPECT_EQ(Call(Way::kTcp, kGet, "{}", header).status, 401);
}

TEST_F(People, DoNotDelayTheEndOfTheServer) {
  Connection hanging = server_->ConnectTcp();
  hanging.Send(Post(std::string(kSession) + "sign_in", Credentials("hang", "x")));
  EXPECT_EQ(SignIn("alice", std::string(kPasswordMark) + "alice").status, 200);
  Stop();
  EXPECT_EQ(server_->log().find("calls are still running"), std::string::npos);
  EXPECT_EQ(hanging.Receive().status, 503);
}

TEST_F(People, LeaveNoHelperBehindWhenTheServerIsKilled) {
  sandbox_.Write("etc/vorn/vornd.conf", "[access]\npassword-time = 1min\n");
  Start();
  Connection hanging = server_->ConnectTcp();
  hanging.Send(Post(std::string(kSession) + "sign_in", Credentials("hang", "x")));
  std::string helper;
  ASSERT_TRUE(Eventually([&] {
    helper = ChildOf(server_->pid());
    return !helper.empty();
  }));
  EXPECT_FALSE(ReadWholeFile("/proc/" + helper + "/cmdline").empty());
  server_->Signal(SIGKILL);
  server_->Wait();
  EXPECT_TRUE(Eventually([&] { return ReadWholeFile("/proc/" + helper + "/cmdline").empty(); }));
}

// Vornd prints the link to its standard output, which is a file here.
TEST(SignInLink, SignsInOnce) {
  const Sandbox sandbox;
  const std::string output = sandbox.File("output");
  const ServerProcess server(sandbox, {"--sign-in-link", "--listen", "127.0.0.1:0"}, output);
  ASSERT_TRUE(server.ready()) << server.log();
  const std::string text = ReadWholeFile(output);
  std::smatch link;
  ASSERT_TRUE(std::regex_search(text, link, std::regex("http://127\\.0\\.0\\.1:[0-9]+/#code=(vornc_[0-9a-f]{72})\n")));
  const std::string code = R"({"code": ")" + link[1].str() + "\"}";
  Connection client = server.ConnectTcp();
  const std::string sign_in = std::string(kSession) + "sign_in";
  client.Send(Post(sign_in, code));
  const Json::Value data = Recorded(sign_in, code, client.Receive()).Envelope()["data"];
  EXPECT_EQ(data["role"], "administrator");
  client.Send(Post(kContext, "{}", BearerHeader(data["token"].asString())));
  EXPECT_EQ(client.Receive().status, 200);
  client.Send(Post(sign_in, code));
  EXPECT_EQ(Recorded(sign_in, code, client.Receive()).status, 401);
}

}  // namespace
}  // namespace vorn::server
