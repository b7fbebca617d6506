// Calls of methods through the real vornd.
#include <gmock/gmock.h>
#include <poll.h>

#include <atomic>
#include <csignal>
#include <filesystem>
#include <thread>
#include <vector>

#include "server_process.h"

namespace vorn::server {
namespace {

using testing::HasSubstr;

class Calls : public testing::Test {
 protected:
  ~Calls() override {
    server_.Signal(SIGTERM);
    EXPECT_EQ(server_.Wait(), 0) << server_.log();
  }
  Reply Call(const std::string& method, const std::string& json = "") {
    Connection client = server_.Connect();
    client.Send(Post("/api/Test.Echo/" + method, json));
    return client.Receive();
  }
  // The parameters of "wait".
  std::string Wait(const std::string& name) const {
    return R"({"begun": ")" + sandbox_.File("begun-" + name) + R"(", "release": ")" + sandbox_.File("release") + "\"}";
  }
  bool HasBegun(const std::string& name) const { return ReadWholeFile(sandbox_.File("begun-" + name)) == "begun"; }

  Sandbox sandbox_;
  ServerProcess server_{sandbox_};
};

TEST_F(Calls, ReachTheirMethod) {
  EXPECT_EQ(Call("v1/get", R"({"a": [1, "ü"]})").Envelope()["data"]["a"][1], "ü");
  EXPECT_EQ(Call("v1/get").Envelope()["data"], Json::Value(Json::objectValue));
  EXPECT_EQ(Call("v2/get", R"({"value": 3})").Envelope()["data"], 3);
  EXPECT_EQ(Call("v2/get").Envelope()["data"], "none");
  EXPECT_EQ(Call("v1/root").Envelope()["data"], sandbox_.path());
}

TEST_F(Calls, FailAsTheDescriptorSays) {
  const Reply known = Call("v1/fail", R"({"code": 2351, "details": ["alice"]})");
  EXPECT_EQ(known.status, 409);
  EXPECT_EQ(known.Envelope()["success"], false);
  EXPECT_EQ(known.Envelope()["error"]["code"], 2351);
  EXPECT_EQ(known.Envelope()["error"]["text"], "It is there already.");
  EXPECT_EQ(known.Envelope()["error"]["details"][0], "alice");
  const Reply unknown = Call("v1/fail", R"({"code": 77})");
  EXPECT_EQ(unknown.status, 500);
  EXPECT_EQ(unknown.Envelope()["error"]["code"], 77);
  EXPECT_FALSE(unknown.Envelope()["error"].isMember("details"));
}

TEST_F(Calls, ThatMayChangeSomethingAreAudited) {
  Call("v1/fail", R"({"code": 2351})");
  EXPECT_THAT(server_.log(), HasSubstr(R"(Test.Echo/v1/fail {"code":2351} failed with 2351, )"));
  Call("v1/get", R"({"a": 1})");
  EXPECT_THAT(server_.log(),
              testing::Not(HasSubstr("audit: uid " + std::to_string(getuid()) + " unix Test.Echo/v1/get")));
}

TEST_F(Calls, OfABrokenMethodAreAnsweredAndLogged) {
  for (const char* method : {"v1/throw", "v1/throw_number", "v1/silent"}) {
    const Reply reply = Call(method);
    EXPECT_EQ(reply.status, 500) << method;
    EXPECT_EQ(reply.Envelope()["error"]["code"], 2302) << method;
  }
  EXPECT_THAT(server_.log(), HasSubstr("Test.Echo v1 throw: no answer: thrown on purpose"));
  EXPECT_THAT(server_.log(), HasSubstr("Test.Echo v1 throw_number: no answer: an exception of unknown type"));
  EXPECT_THAT(server_.log(), HasSubstr("Test.Echo v1 silent: no answer: the method ended without one"));
  EXPECT_EQ(Call("v1/get").status, 200) << "the server goes on";
}

TEST_F(Calls, WithWrongJsonSayWhere) {
  const Reply reply = Call("v1/get", "{\"a\": 1,\n \"a\": 2}");
  EXPECT_EQ(reply.status, 400);
  EXPECT_EQ(reply.Envelope()["error"]["text"],
            "The parameters are not valid JSON. Line 2, Column 2: Duplicate key: 'a'.");
}

TEST_F(Calls, AnswerValidJsonWhateverTheModuleSays) { EXPECT_TRUE(Call("v1/binary").Envelope()["success"].asBool()); }

TEST_F(Calls, AnswerReasonsAndWarnings) {
  const std::string remarks = R"("reasons": ["a", "b"], "warnings": ["c"])";
  const Json::Value failed = Call("v1/remark", "{" + remarks + R"(, "code": 2301})").Envelope();
  EXPECT_EQ(failed["error"]["reasons"].size(), 2U);
  EXPECT_EQ(failed["error"]["reasons"][1], "b");
  EXPECT_EQ(failed["warnings"][0], "c");
  const Json::Value succeeded = Call("v1/remark", "{" + remarks + "}").Envelope();
  EXPECT_FALSE(succeeded.isMember("error"));
  EXPECT_EQ(succeeded["warnings"][0], "c");
  const Json::Value plain = Call("v1/remark", R"({"code": 2301})").Envelope();
  EXPECT_FALSE(plain.isMember("warnings"));
  EXPECT_FALSE(plain["error"].isMember("reasons"));
}

TEST_F(Calls, MayWriteUnlessTheDescriptorSaysThatTheyOnlyRead) {
  const Json::Value changing = Call("v1/context").Envelope()["data"];
  EXPECT_EQ(changing["may_write"], true);
  EXPECT_EQ(changing["method"], "Test.Echo/v1/context");
  EXPECT_EQ(changing["origin"], "unix");
  EXPECT_TRUE(changing["uploads"].empty());
  EXPECT_EQ(Call("v2/context").Envelope()["data"]["may_write"], false);
}

TEST_F(Calls, AreListed) {
  Connection client = server_.ConnectTcp();
  client.Send(Get("/api", ServerProcess::TokenHeader()));
  const Json::Value data = client.Receive().Envelope()["data"];
  ASSERT_EQ(data.size(), 22U);
  EXPECT_EQ(data[12]["api"], "Test.Echo");
  EXPECT_EQ(data[12]["version"], 2);
  EXPECT_EQ(data[14]["api"], "VORN.Server.Session");
  EXPECT_EQ(data[21]["method"], "revoke");
  client.Send(Get("/healthz"));
  EXPECT_EQ(client.Receive().status, 200);
}

TEST_F(Calls, ThatAreSlowDelayNoOtherCall) {
  std::vector<Connection> slow;
  for (int i = 0; i < 50; ++i) {
    slow.push_back(server_.Connect());
    slow.back().Send(Post("/api/Test.Echo/v1/wait", Wait(std::to_string(i))));
  }
  EXPECT_TRUE(Eventually([&] { return HasBegun("0") && HasBegun("3"); }));
  for (int i = 0; i < 20; ++i) EXPECT_EQ(Call("v1/get").status, 200);
  EXPECT_FALSE(HasBegun("4")) << "one method has its share of the workers and no more";
  sandbox_.Write("release", "");
  for (Connection& client : slow) EXPECT_EQ(client.Receive().Envelope()["data"], "released");
}

TEST_F(Calls, OfManyParametersDoNotDelayOthersOfTheirMethod) {
  const std::string padding(2000, ' ');
  std::vector<Connection> large;
  for (int i = 0; i < 50; ++i) {
    large.push_back(server_.ConnectTcp());
    large.back().Send(
        Post("/api/Test.Echo/v1/wait", Wait(i == 0 ? "first" : "later") + padding, ServerProcess::TokenHeader()));
  }
  EXPECT_TRUE(Eventually([&] { return HasBegun("first") || HasBegun("later"); }));
  sandbox_.Write("now", "");
  const std::string small = R"({"begun": "/dev/null", "release": ")" + sandbox_.File("now") + "\"}";
  for (int i = 0; i < 20; ++i) EXPECT_EQ(Call("v1/wait", small).status, 200);
  EXPECT_NE(HasBegun("first"), HasBegun("later")) << "one large call of a method runs at a time";
  sandbox_.Write("release", "");
  for (Connection& client : large) EXPECT_EQ(client.Receive().Envelope()["data"], "released");
}

TEST_F(Calls, BeyondTheQueueOfTheirMethodAreRefused) {
  std::vector<Connection> slow;
  for (int i = 0; i < 260; ++i) {  // four run, 256 wait
    slow.push_back(server_.Connect());
    slow.back().Send(Post("/api/Test.Echo/v1/wait", Wait("0")));
  }
  Reply refused;
  EXPECT_TRUE(Eventually([&] {
    Connection one_more = server_.Connect();
    one_more.Send(Post("/api/Test.Echo/v1/wait", Wait("0")));
    pollfd answered{one_more.socket(), POLLIN, 0};
    if (poll(&answered, 1, 20) == 1) refused = one_more.Receive();
    slow.push_back(std::move(one_more));
    return refused.status != 0;
  }));
  EXPECT_EQ(refused.status, 503);
  EXPECT_EQ(refused.headers["Retry-After"], "1");
  EXPECT_EQ(Call("v1/get").status, 200) << "other methods have queues of their own";
  sandbox_.Write("release", "");
  EXPECT_EQ(slow[0].Receive().status, 200);
  EXPECT_TRUE(Eventually([&] { return Call("v1/wait", Wait("0")).status == 200; }));
}

// Calls of two methods that hang are more than a listener may have connections.
TEST_F(Calls, ThatHangLeaveConnectionsToOthers) {
  const auto connect = [this](bool local) { return local ? server_.Connect() : server_.ConnectTcp(); };
  for (const bool local : {false, true}) {
    std::vector<Connection> hung;
    for (int i = 0; i < 700; ++i) {
      const std::string method = i % 2 == 0 ? "v1/wait" : "v2/wait";
      hung.push_back(connect(local));
      hung.back().Send(Post("/api/Test.Echo/" + method, Wait(std::to_string(i % 2)), ServerProcess::TokenHeader()));
    }
    EXPECT_TRUE(Eventually([&] { return HasBegun("0") && HasBegun("1"); }));
    for (int i = 0; i < 20; ++i) {
      Connection client = connect(local);
      client.Send(Post("/api/Test.Echo/v1/get", "", ServerProcess::TokenHeader()));
      EXPECT_EQ(client.Receive().status, 200) << i;
    }
    sandbox_.Write("release", "");
    int released = 0;
    for (Connection& client : hung) released += client.Receive().status == 200;
    EXPECT_GT(released, 200) << "most of the calls that wait are not given up";
    std::filesystem::remove(sandbox_.File("release"));
  }
}

TEST_F(Calls, WithMoreValuesThanAllowedAreRefused) {
  std::string bomb = R"({"a":[[])";
  for (int i = 0; i < 300000; ++i) bomb += ",[]";
  const Reply reply = Call("v1/get", bomb + "]}");
  EXPECT_EQ(reply.status, 413);
  EXPECT_THAT(reply.Envelope()["error"]["text"].asString(), HasSubstr("more than 100000 values"));
}

TEST_F(Calls, ShowThatTheServerIsReady) {
  Connection client = server_.Connect();
  for (const char* target : {"/healthz", "/healthz/live", "/healthz/ready"}) {
    client.Send(Get(target));
    EXPECT_EQ(client.Receive().status, 200) << target;
  }
}

TEST_F(Calls, InParallelEachGetTheirOwnAnswer) {
  std::atomic<int> right{0};
  std::vector<std::thread> clients;
  for (int c = 0; c < 16; ++c) {
    clients.emplace_back([&, c] {
      Connection client = c % 2 == 0 ? server_.Connect() : server_.ConnectTcp();
      for (int i = 0; i < 100; ++i) {
        const int mine = c * 1000 + i;
        client.Send(
            Post("/api/Test.Echo/v1/get", "{\"mine\": " + std::to_string(mine) + "}", ServerProcess::TokenHeader()));
        if (client.Receive().Envelope()["data"]["mine"] == mine) ++right;
      }
    });
  }
  for (std::thread& client : clients) client.join();
  EXPECT_EQ(right, 1600);
}

TEST_F(Calls, OfClientsThatLeaveAreForgotten) {
  for (int i = 0; i < 50; ++i) server_.Connect().Send(Post("/api/Test.Echo/v1/get", "{\"a\": 1}"));
  EXPECT_EQ(Call("v1/get").status, 200);
}

}  // namespace
}  // namespace vorn::server
