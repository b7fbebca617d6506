// How the real vornd starts, stops and recovers.
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <vector>

#include "server_process.h"

namespace vorn::server {
namespace {

using testing::HasSubstr;

int StatusOf(Connection client) {
  client.Send(Get("/healthz"));
  return client.Receive().status;
}

TEST(Vornd, ListensAtTheSocketOfItsRoot) {
  const Sandbox sandbox;
  const ServerProcess server(sandbox, {"--listen", "unix:" + sandbox.File("run/vorn/vornd.sock")});
  ASSERT_TRUE(server.ready()) << server.log();
  EXPECT_EQ(StatusOf(server.Connect()), 200);
}

TEST(Vornd, RemovesTheTemporaryFilesOfKilledWriters) {
  const Sandbox sandbox;
  for (const char* folder : {"etc/nfs.conf.d", "etc/nfs", "etc/systemd/system/nfs-server.service.d", "var/lib/vorn"}) {
    std::filesystem::create_directories(sandbox.File(folder));
  }
  const char* const left[] = {"etc/.exports.vorn-a1B2c3",
                              "etc/.idmapd.conf.vorn-a1B2c3",
                              "etc/nfs.conf.d/.vorn.conf.vorn-a1B2c3",
                              "etc/nfs/.krb5.keytab.vorn-a1B2c3",
                              "etc/systemd/system/nfs-server.service.d/.vorn.conf.vorn-a1B2c3",
                              "var/lib/vorn/.firewall.nft.vorn-a1B2c3"};
  const char* const foreign[] = {"etc/exports", "etc/.exports.vorn-backups", "etc/.passwd.vorn-a1B2c3"};
  for (const char* file : left) sandbox.Write(file, "text");
  for (const char* file : foreign) sandbox.Write(file, "text");
  const ServerProcess server(sandbox);
  ASSERT_TRUE(server.ready()) << server.log();
  for (const char* file : left) EXPECT_FALSE(std::filesystem::exists(sandbox.File(file))) << file;
  for (const char* file : foreign) EXPECT_EQ(ReadWholeFile(sandbox.File(file)), "text") << file;
}

TEST(Vornd, ListensThereByDefault) {
  const Sandbox sandbox;
  const ServerProcess server(sandbox, {"--modules", TEST_MODULES});  // no --listen
  ASSERT_TRUE(server.ready()) << server.log();
  EXPECT_EQ(StatusOf(server.Connect()), 200);
  struct stat there {};
  ASSERT_EQ(stat(server.socket().c_str(), &there), 0);
  EXPECT_EQ(there.st_mode & 07777, 0666U);
}

// Starts a call that runs until the sandbox has a file "release". Returns once the call is running.
Connection BeginCall(const Sandbox& sandbox, const ServerProcess& server) {
  Connection client = server.Connect();
  client.Send(Post("/api/Test.Echo/v1/wait",
                   R"({"begun": ")" + sandbox.File("begun") + R"(", "release": ")" + sandbox.File("release") + "\"}"));
  EXPECT_TRUE(Eventually([&] { return std::filesystem::exists(sandbox.File("begun")); }));
  return client;
}

TEST(Vornd, FinishesARunningCallAndThenEnds) {
  const Sandbox sandbox;
  ServerProcess server(sandbox);
  Connection running = BeginCall(sandbox, server);
  server.Signal(SIGTERM);
  EXPECT_TRUE(Eventually([&] { return !server.ConnectTcp().connected(); })) << "no new connections";
  sandbox.Write("release", "");
  Reply reply = running.Receive();
  EXPECT_EQ(reply.Envelope()["data"], "released");
  EXPECT_EQ(reply.headers["Connection"], "close");
  EXPECT_EQ(server.Wait(), 0) << server.log();
  EXPECT_FALSE(std::filesystem::exists(server.socket()));
}

// Four calls of a method run at the same time.
TEST(Vornd, RefusesTheCallsThatHaveNotBegunWhenItStops) {
  const Sandbox sandbox;
  ServerProcess server(sandbox);
  std::vector<Connection> running;
  for (int i = 0; i < 4; ++i) {
    running.push_back(BeginCall(sandbox, server));
    std::filesystem::remove(sandbox.File("begun"));
  }
  Connection queued = server.Connect();
  queued.Send(
      Post("/api/Test.Echo/v1/wait", R"({"begun": ")" + sandbox.File("late") + R"(", "release": "/dev/null"})"));
  Connection other = server.Connect();
  EXPECT_TRUE(Eventually([&] {
    other.Send(Get("/metrics"));
    return other.Receive().body.find("vorn_calls_waiting{kind=\"changing\"} 1\n") != std::string::npos;
  }));
  server.Signal(SIGTERM);
  const Reply reply = queued.Receive();
  EXPECT_EQ(reply.status, 503);
  EXPECT_EQ(reply.headers.at("Retry-After"), "1");
  EXPECT_THAT(reply.body, HasSubstr("The server is stopping."));
  sandbox.Write("release", "");
  for (Connection& client : running) EXPECT_EQ(client.Receive().Envelope()["data"], "released");
  EXPECT_EQ(server.Wait(), 0) << server.log();
  EXPECT_FALSE(std::filesystem::exists(sandbox.File("late"))) << "the call has not begun";
}

TEST(Vornd, EndsOnInterruptWithIdleClients) {
  const Sandbox sandbox;
  ServerProcess server(sandbox);
  Connection idle = server.Connect();
  idle.Send(Get("/healthz"));
  EXPECT_EQ(idle.Receive().status, 200);
  server.Signal(SIGINT);
  EXPECT_TRUE(idle.IsClosedByServer());
  EXPECT_EQ(server.Wait(), 0) << server.log();
}

TEST(Vornd, ASecondSignalEndsItWhileACallRuns) {
  const Sandbox sandbox;
  ServerProcess server(sandbox);
  Connection running = BeginCall(sandbox, server);
  server.Signal(SIGTERM);
  EXPECT_TRUE(Eventually([&] { return !server.ConnectTcp().connected(); })) << "the first is being handled";
  server.Signal(SIGINT);
  EXPECT_EQ(server.Wait(), 128 + SIGINT) << server.log();
}

TEST(Vornd, EndsWithoutACallThatNeverEnds) {
  const Sandbox sandbox;
  setenv("TSAN_OPTIONS", "report_thread_leaks=0", 1);  // it ends without joining its threads
  ServerProcess server(sandbox);
  unsetenv("TSAN_OPTIONS");
  Connection running = BeginCall(sandbox, server);
  server.Signal(SIGTERM);
  EXPECT_EQ(server.Wait(), 0);
  EXPECT_THAT(server.log(), HasSubstr("calls are still running"));
}

TEST(Vornd, StartsAgainAfterItWasKilled) {
  const Sandbox sandbox;
  ServerProcess killed(sandbox);
  killed.Signal(SIGKILL);
  EXPECT_EQ(killed.Wait(), 128 + SIGKILL);
  EXPECT_TRUE(std::filesystem::exists(killed.socket()));
  const ServerProcess next(sandbox);
  ASSERT_TRUE(next.ready()) << next.log();
  EXPECT_EQ(StatusOf(next.Connect()), 200);
}

TEST(Vornd, IsRefusedARootThatIsServed) {
  const Sandbox sandbox;
  const ServerProcess first(sandbox);
  ServerProcess second(sandbox);
  EXPECT_FALSE(second.ready());
  EXPECT_EQ(second.Wait(), 1);
  EXPECT_THAT(second.log(), HasSubstr("another vornd serves this root"));
  EXPECT_EQ(StatusOf(first.Connect()), 200);
}

TEST(Vornd, SaysWhyItDoesNotStart) {
  const Sandbox sandbox;
  std::filesystem::create_directory(sandbox.File("empty"));
  const struct {
    std::vector<std::string> arguments;
    const char* text;
    int status;
  } cases[] = {
      {{"--listen", "0.0.0.0:80"}, "--listen: \"0.0.0.0:80\": only unix:/PATH, 127.0.0.1:PORT and [::1]:PORT", 1},
      {{"--listen", "unix:/nonexistent/s"}, "/nonexistent/s: No such file or directory", 1},
      {{"--modules", sandbox.File("empty")}, "there is no module to serve", 1},
      {{"--root", "/nonexistent"}, "--root: No such file or directory", 1},
      {{"--nonsense"}, "--nonsense", 2},
  };
  for (const auto& c : cases) {
    ServerProcess server(sandbox, c.arguments);
    EXPECT_FALSE(server.ready()) << c.text;
    EXPECT_EQ(server.Wait(), c.status) << c.text;
    EXPECT_THAT(server.log(), HasSubstr(c.text));
  }
}

}  // namespace
}  // namespace vorn::server
