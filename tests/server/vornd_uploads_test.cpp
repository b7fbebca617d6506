// Files sent to the real vornd.
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>

#include <csignal>
#include <filesystem>
#include <functional>
#include <iterator>
#include <vector>

#include "server_process.h"

namespace vorn::server {
namespace {

std::string Part(const std::string& disposition, const std::string& data) {
  return "--b\r\nContent-Disposition: form-data; " + disposition + "\r\n\r\n" + data + "\r\n";
}

std::string FormHead(std::size_t size, const std::string& method = "upload") {
  return "POST /api/Test.Echo/v1/" + method +
         " HTTP/1.1\r\nHost: localhost\r\nContent-Type: multipart/form-data; boundary=b\r\nContent-Length: " +
         std::to_string(size) + "\r\n\r\n";
}

class Uploads : public testing::Test {
 protected:
  ~Uploads() override {
    server_.Signal(SIGTERM);
    EXPECT_EQ(server_.Wait(), 0) << server_.log();
  }
  Reply Send(const std::string& form) {
    Connection client = server_.Connect();
    client.Send(FormHead(form.size()) + form);
    return client.Receive();
  }
  bool NothingIsLeft() const { return std::filesystem::is_empty(sandbox_.File("run/vorn/uploads")); }

  const std::string file_ = "name=keytab_file; filename=k";
  Sandbox sandbox_;
  ServerProcess server_{sandbox_};
};

TEST_F(Uploads, ReachTheMethodAsPrivateFiles) {
  const Reply reply = Send(Part("name=note", "text") + Part(file_, "keytab") + "--b--\r\n");
  const Json::Value data = reply.Envelope()["data"];
  EXPECT_EQ(data["size"], 6) << reply.body;
  EXPECT_EQ(data["mode"], 0600);
  EXPECT_EQ(data["first"], 'k');
  EXPECT_EQ(data["note"], "text");
  EXPECT_TRUE(NothingIsLeft());
}

TEST_F(Uploads, AreListedInTheCallContext) {
  const std::string form = Part("name=note", "text") + Part(file_, "keytab") + "--b--\r\n";
  Connection client = server_.Connect();
  client.Send(FormHead(form.size(), "context") + form);
  const Json::Value uploads = client.Receive().Envelope()["data"]["uploads"];
  ASSERT_EQ(uploads.size(), 1U);
  EXPECT_EQ(uploads[0].asString().rfind(sandbox_.File("run/vorn/uploads/"), 0), 0U) << uploads[0].asString();
}

TEST_F(Uploads, MayBeRemovedByTheMethod) {
  EXPECT_EQ(Send(Part(file_, "k") + Part("name=remove", "yes") + "--b--").Envelope()["data"]["size"], 1);
  EXPECT_TRUE(NothingIsLeft());
}

TEST_F(Uploads, OfTheLargestSizeAreTakenAndLargerOnesRefused) {
  EXPECT_EQ(Send(Part(file_, std::string(1024 * 1024, 'x')) + "--b--").Envelope()["data"]["size"], 1024 * 1024);
  EXPECT_EQ(Send(Part(file_, std::string(1024 * 1024 + 1, 'x')) + "--b--").status, 413);
  EXPECT_EQ(Send(std::string(2 * 1024 * 1024, 'x')).status, 413);
  EXPECT_TRUE(NothingIsLeft());
}

TEST_F(Uploads, OfTooManyPartsAreRefusedBeforeTheirEnd) {
  std::string begin;
  for (int i = 0; i < 9; ++i) begin += Part("name=f" + std::to_string(i) + "; filename=k", "x");
  Connection client = server_.Connect();
  client.Send(FormHead(1024 * 1024) + begin);
  EXPECT_EQ(client.Receive().status, 413);
}

TEST_F(Uploads, NeverReadAFileOfTheServer) {
  EXPECT_EQ(Send(Part("name=keytab_file_tmp", "/etc/passwd") + "--b--").status, 400);
  Connection client = server_.Connect();
  client.Send(Post("/api/Test.Echo/v1/upload", R"({"keytab_file_tmp": "/etc/passwd"})"));
  EXPECT_EQ(client.Receive().status, 400);
}

TEST_F(Uploads, ThatBreakOffLeaveNothing) {
  {
    Connection client = server_.Connect();
    client.Send(FormHead(1000) + Part(file_, "half"));
  }
  EXPECT_EQ(Send(Part(file_, "whole") + "--b--").status, 200);
  EXPECT_TRUE(NothingIsLeft());
}

TEST_F(Uploads, OfAKilledServerAreRemovedByTheNext) {
  const Sandbox sandbox;
  ServerProcess killed(sandbox);
  Connection client = killed.Connect();
  const std::string form = Part(file_, "k") + Part("name=begun", sandbox.File("begun")) +
                           Part("name=release", sandbox.File("release")) + "--b--";
  client.Send(FormHead(form.size(), "wait") + form);
  EXPECT_TRUE(Eventually([&] { return std::filesystem::exists(sandbox.File("begun")); }));
  const std::string folder = sandbox.File("run/vorn/uploads");
  EXPECT_FALSE(std::filesystem::is_empty(folder)) << "the method runs, so its file is there";
  killed.Signal(SIGKILL);
  killed.Wait();
  EXPECT_FALSE(std::filesystem::is_empty(folder));
  const ServerProcess next(sandbox);
  EXPECT_TRUE(next.ready());
  EXPECT_TRUE(std::filesystem::is_empty(folder));
}

// Returns the status of a request after `count` connections that remain idle.
int StatusBehindIdleConnections(const std::function<Connection()>& connect, int count, std::vector<Connection>* idle) {
  for (int i = 0; i < count; ++i) idle->push_back(connect());
  idle->push_back(connect());
  idle->back().Send(Get("/healthz"));
  return idle->back().Receive().status;
}

TEST(Descriptors, AreReservedForTheFilesOfCalls) {
  const Sandbox sandbox;
  rlimit before{};
  ASSERT_EQ(getrlimit(RLIMIT_NOFILE, &before), 0);
  const rlimit few{320, before.rlim_max};
  setrlimit(RLIMIT_NOFILE, &few);
  ServerProcess server(sandbox);
  setrlimit(RLIMIT_NOFILE, &before);
  std::vector<Connection> idle;
  EXPECT_EQ(StatusBehindIdleConnections([&] { return server.ConnectTcp(); }, 250, &idle), 200);
  EXPECT_EQ(StatusBehindIdleConnections([&] { return server.Connect(); }, 150, &idle), 200);
  const std::filesystem::directory_iterator descriptors("/proc/" + std::to_string(server.pid()) + "/fd");
  EXPECT_LT(std::distance(begin(descriptors), end(descriptors)), 160);
  Connection client = server.Connect();
  const std::string form = Part("name=keytab_file; filename=k", "keytab") + "--b--\r\n";
  client.Send(FormHead(form.size()) + form);
  EXPECT_EQ(client.Receive().Envelope()["data"]["size"], 6);
  EXPECT_EQ(server.log().find("No connection accepted"), std::string::npos);
  server.Signal(SIGTERM);
  EXPECT_EQ(server.Wait(), 0) << server.log();
}

}  // namespace
}  // namespace vorn::server
