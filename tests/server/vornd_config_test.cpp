// The configuration file of the real vornd: read at the start, checked, and read again.
#include <gmock/gmock.h>

#include <csignal>
#include <filesystem>

#include "server_process.h"

namespace vorn::server {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

class Configured : public testing::Test {
 protected:
  Configured() { std::filesystem::create_directories(sandbox_.File("etc/vorn")); }

  void Configure(const std::string& text) const { sandbox_.Write("etc/vorn/vornd.conf", text); }
  std::string Listening() const { return "[server]\nlisten = unix:" + sandbox_.File("run/vorn/vornd.sock") + "\n"; }

  // Runs vornd with "--check" and `arguments`. Returns its exit status, and its output in `text`.
  int Check(std::string* text, std::vector<std::string> arguments = {}) const {
    arguments.emplace_back("--check");
    const std::string output = sandbox_.File("output");
    ServerProcess process(sandbox_, arguments, output);
    const int status = process.Wait();
    *text = process.log() + ReadWholeFile(output);
    return status;
  }

  static Reply Ask(Connection client, const std::string& request) {
    client.Send(request);
    return client.Receive();
  }

  Sandbox sandbox_;
};

TEST_F(Configured, ServerFollowsItsFileAndTheOptionsOverrideIt) {
  Configure("[server]\nlisten = unix:" + sandbox_.File("file.sock") + "\n");
  {
    const ServerProcess server(sandbox_, {"--host-name", "nas"});
    ASSERT_TRUE(server.ready()) << server.log();
    EXPECT_EQ(Ask(Connection::ToUnix(sandbox_.File("file.sock")), Get("/healthz")).status, 200);
  }
  const ServerProcess server(sandbox_, {"--listen", "unix:" + sandbox_.File("option.sock")});
  ASSERT_TRUE(server.ready()) << server.log();
  EXPECT_EQ(Ask(Connection::ToUnix(sandbox_.File("option.sock")), Get("/healthz")).status, 200);
  EXPECT_FALSE(Connection::ToUnix(sandbox_.File("file.sock")).connected());
}

TEST_F(Configured, ServerDoesNotStartWithAFaultAndTouchesNothing) {
  Configure("[server]\nlisten = unix:/a\n lisen = unix:/b\n[log]\nlevel = loud\n");
  ServerProcess server(sandbox_, {"--host-name", "nas"});
  EXPECT_FALSE(server.ready());
  EXPECT_EQ(server.Wait(), 1);
  const std::string path = sandbox_.File("etc/vorn/vornd.conf");
  EXPECT_THAT(server.log(), AllOf(HasSubstr(path + ":3:2: there is no key \"lisen\" in [server]"),
                                  HasSubstr(path + ":5:9: level: \"loud\" is not")));
  EXPECT_FALSE(std::filesystem::exists(sandbox_.File("run")));
}

TEST_F(Configured, CheckReportsFaultsWithoutTouchingARunningServer) {
  Configure(Listening());
  const ServerProcess server(sandbox_, {"--host-name", "nas"});
  ASSERT_TRUE(server.ready()) << server.log();
  std::string text;
  EXPECT_EQ(Check(&text), 0) << text;
  EXPECT_THAT(text, HasSubstr("vornd.conf: no fault"));
  Configure("[sessions]\nlifetime = 1min\nidle = 2min\n");
  EXPECT_EQ(Check(&text), 1);
  EXPECT_THAT(text, HasSubstr("vornd.conf:3:8: idle is longer than the lifetime of a session"));
  Configure("[sessions]\nlifetime = 10min\n");
  EXPECT_EQ(Check(&text), 1);
  EXPECT_THAT(text, HasSubstr("vornd.conf:2:12: idle is longer than the lifetime of a session"));
  EXPECT_EQ(Check(&text, {"--config", sandbox_.File("none")}), 1);
  EXPECT_THAT(text, HasSubstr("none: No such file or directory"));
  EXPECT_EQ(Check(&text, {"--modules", "m", "--readers", "a b"}), 1);
  EXPECT_THAT(text, HasSubstr("--readers: \"a b\" is no name of a group"));
  EXPECT_EQ(Ask(server.Connect(), Get("/healthz")).status, 200);
}

TEST_F(Configured, ReloadAppliesWhatCanChange) {
  Configure(Listening());
  const ServerProcess server(sandbox_, {"--modules", TEST_MODULES});
  ASSERT_TRUE(server.ready()) << server.log();
  // A request for a given name comes from a proxy and needs a token, which a request for another one does not.
  const std::string request =
      "POST /api/Test.Echo/v1/context HTTP/1.1\r\nHost: nas.example\r\nContent-Length: 0\r\n\r\n";
  Connection client = server.Connect();
  EXPECT_EQ(Ask(server.Connect(), request).status, 200);
  Configure(Listening() + "host-names = nas.example\n[limits]\nhead-time = 20s\n[log]\nlevel = notice\n");
  server.Signal(SIGHUP);
  EXPECT_TRUE(Eventually([&] { return server.log().find("was read again") != std::string::npos; }));
  EXPECT_THAT(server.log(), HasSubstr("[limits] head-time has changed, which only a restart applies"));
  EXPECT_THAT(server.log(), Not(HasSubstr("[server] host-names has changed")));
  EXPECT_EQ(Ask(std::move(client), request).status, 401) << "also for a connection from before";
}

TEST_F(Configured, ReloadWithAFaultChangesNothing) {
  Configure(Listening() + "host-names = nas.example\n");
  const ServerProcess server(sandbox_, {"--modules", TEST_MODULES});
  ASSERT_TRUE(server.ready()) << server.log();
  Configure(Listening() + "host-names = other.example\n[log]\nlevel = loud\n");
  server.Signal(SIGHUP);
  EXPECT_TRUE(Eventually([&] { return server.log().find("the previous one stays in force") != std::string::npos; }));
  EXPECT_THAT(server.log(), HasSubstr("vornd.conf:5:9: level: "));
  const std::string request =
      "POST /api/Test.Echo/v1/context HTTP/1.1\r\nHost: nas.example\r\nContent-Length: 0\r\n\r\n";
  EXPECT_EQ(Ask(server.Connect(), request).status, 401);
}

TEST_F(Configured, ReloadConcernsSessionsThatHaveBegun) {
  Configure(Listening());
  const std::string output = sandbox_.File("output");
  const ServerProcess server(sandbox_, {"--sign-in-link", "--listen", "127.0.0.1:0"}, output);
  ASSERT_TRUE(server.ready()) << server.log();
  const std::string text = ReadWholeFile(output);
  const std::string code = text.substr(text.find("vornc_"), 78);
  const Reply reply =
      Ask(server.ConnectTcp(), Post("/api/VORN.Server.Session/v1/sign_in", R"({"code": ")" + code + "\"}"));
  const std::string header = BearerHeader(reply.Envelope()["data"]["token"].asString());
  const auto status = [&] { return Ask(server.ConnectTcp(), Post("/api/Test.Echo/v1/get", "{}", header)).status; };
  EXPECT_EQ(status(), 200);
  Configure("[sessions]\nidle = 1s\nlifetime = 1s\n");
  server.Signal(SIGHUP);
  EXPECT_TRUE(Eventually([&] { return status() == 401; }));
}

}  // namespace
}  // namespace vorn::server
