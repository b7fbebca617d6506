// The API "VORN.Core.FileServ.NFS.Client" against the fake platform.
#include "clients_handler.h"

#include <gmock/gmock.h>

#include <string>

#include "fake_platform.h"

namespace {

using testing::Contains;
using testing::Not;

constexpr char kAPI[] = "VORN.Core.FileServ.NFS.Client";

Answer List(const std::string& params) { return Call(EntryOf(kAPI, "list"), params); }
Answer Disconnect(const std::string& params) { return Call(EntryOf(kAPI, "disconnect"), params); }

TEST(ClientsHandler, ListsAPageOfTheClientsThatMatch) {
  FakePlatform platform;
  platform.client.address = "10.0.0.5";
  platform.client.version = "4.2";
  platform.client.id = 7;
  platform.client.client_id = "0x2";
  platform.client.open_files = 0;
  platform.client.renewed = 3;
  platform.client.exports = {{"/srv/data", true, "10.0.0.0/24", 1, 2, 3}};
  platform.client.refusals = {{"/srv/more", "port", "A sentence.", 4, 5}};
  const Answer answer = List(R"({"filter": "data", "offset": 3, "limit": 4})");
  EXPECT_EQ(answer.code, 0);
  EXPECT_THAT(platform.calls, Contains("ListClients 'data' 3 4"));
  EXPECT_EQ(answer.data["total"], 1);
  const Json::Value expected = Parse(R"([{
      "address": "10.0.0.5", "name": null, "version": "4.2", "state": null, "since": null, "id": 7, "client_id": "0x2",
      "implementation": null, "renewed": 3, "open_files": 0, "locks": null, "delegations": null,
      "exports": [{"path": "/srv/data", "mounted": true, "rule": "10.0.0.0/24", "bytes_read": 1, "bytes_written": 2,
                   "since": 3}],
      "refusals": [{"path": "/srv/more", "reason": "port", "text": "A sentence.", "count": 4, "last": 5}]}])");
  EXPECT_EQ(answer.data["clients"].toStyledString(), expected.toStyledString());
}

TEST(ClientsHandler, ShowsWhatIsNotKnownAsNull) {
  FakePlatform platform;
  platform.client.exports = {{"/srv/data", false, "", {}, {}, {}}};
  platform.client.refusals = {{"", "no_rule", "A sentence.", 0, {}}};
  const Answer answer = List("{}");
  EXPECT_THAT(platform.calls, Contains("ListClients '' 0 50"));
  const Json::Value& client = answer.data["clients"][0];
  for (const char* name : {"address", "id", "client_id", "open_files"}) EXPECT_TRUE(client[name].isNull()) << name;
  for (const char* name : {"rule", "bytes_read", "bytes_written", "since"}) {
    EXPECT_TRUE(client["exports"][0][name].isNull()) << name;
  }
  for (const char* name : {"path", "count", "last"}) EXPECT_TRUE(client["refusals"][0][name].isNull()) << name;
}

TEST(ClientsHandler, RefusesParametersOfAnotherKind) {
  FakePlatform platform;
  for (const char* params : {R"({"filter": 1})", R"({"filter": "a\u0000b"})", R"({"offset": -1})", R"({"limit": 1001})",
                             R"({"limit": "1"})"}) {
    EXPECT_EQ(List(params).code, kBadParameter) << params;
  }
  for (const char* params : {"{}", R"({"id": 7})", R"({"client_id": "0x2"})", R"({"id": -1, "client_id": "0x2"})",
                             R"({"id": 4294967296, "client_id": "0x2"})", R"({"id": 7, "client_id": ""})",
                             R"({"id": "7", "client_id": "0x2"})", R"({"id": 7, "client_id": 2})"}) {
    EXPECT_EQ(Disconnect(params).code, kBadParameter) << params;
  }
  EXPECT_THAT(platform.calls, Not(Contains(testing::HasSubstr("Client"))));
}

TEST(ClientsHandler, DisconnectsAClient) {
  FakePlatform platform;
  EXPECT_EQ(Disconnect(R"({"id": 7, "client_id": "0x2"})").code, 0);
  EXPECT_THAT(platform.calls, Contains("DisconnectClient 7 '0x2'"));
}

TEST(ClientsHandler, SaysWhyItFails) {
  FakePlatform platform;
  platform.Fail("ListClients");
  EXPECT_EQ(List("{}").code, kPlatformFailure);
  platform.Fail("DisconnectClient");
  EXPECT_EQ(Disconnect(R"({"id": 7, "client_id": "0x2"})").code, kPlatformFailure);
  platform.FailWith("DisconnectClient", VORN::kClientsGone);
  EXPECT_EQ(Disconnect(R"({"id": 7, "client_id": "0x2"})").code, kClientGone);
}

}  // namespace
