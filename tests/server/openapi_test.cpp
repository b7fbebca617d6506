#include "openapi.h"

#include <gmock/gmock.h>
#include <syslog.h>

#include <filesystem>
#include <regex>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "resources.h"
#include "sandbox.h"
#include "server_methods.h"
#include "sign_in_call.h"

namespace vorn::server {
namespace {

using testing::ContainerEq;
using testing::ElementsAre;
using testing::HasSubstr;

void Nothing(VORN::APIRequest* /*request*/, VORN::APIResponse* response) { response->SetSuccess({}); }

Module Describe(const char* api, const std::string& descriptor) {
  std::string error;
  auto parsed = Descriptor::Parse(descriptor, &error);
  EXPECT_TRUE(parsed) << error;
  return {std::string(api) + ".so",
          {{api, 1, "get", Nothing}, {api, 1, "set", Nothing}, {api, 1, "undescribed", Nothing}},
          parsed.value_or(Descriptor())};
}

const char* const kDescriptor = R"({
    "tags": [{"name": "A"}],
    "paths": {
      "/api/A/v1/get": {"post": {"x-read-only": true, "responses": {"200": {"description": "The size.", "content": {
          "application/json": {"schema": {"$ref": "#/components/schemas/Size"}, "examples": {"one": {"value": 1}}}}}}}},
      "/api/A/v1/set": {"post": {"x-shown-by": {"method": "A/v1/get"}, "x-error-codes": {
          "2301": {"when": "Wrong size.", "details": {"type": "integer"}}, "2302": {"when": "Disk full."}}}},
      "/api/A/v1/absent": {"post": {}}},
    "components": {"schemas": {"Size": {"type": "integer"}}},
    "x-error-codes": {"2301": {"status": 400, "text": "Wrong."}, "2302": {"status": 500, "text": "Failed."}}})";

Json::Value DocumentOf(const std::vector<Module>& modules) { return OpenApiDocument(Routes(modules)); }

const Json::Value& SchemaOf(const Json::Value& operation, const char* status) {
  return operation["responses"][status]["content"]["application/json"]["schema"];
}

TEST(OpenApi, DescribesTheEnvelopeOfAResult) {
  const Json::Value document = DocumentOf({Describe("A", kDescriptor)});
  const Json::Value& get = document["paths"]["/api/A/v1/get"]["post"];
  EXPECT_EQ(get["operationId"], "A/v1/get");
  EXPECT_EQ(SchemaOf(get, "200")["properties"]["data"]["$ref"], "#/components/schemas/Size");
  EXPECT_EQ(SchemaOf(get, "200")["properties"]["success"]["const"], true);
  const Json::Value& example = get["responses"]["200"]["content"]["application/json"]["examples"]["one"]["value"];
  EXPECT_EQ(example["success"], true);
  EXPECT_EQ(example["data"], 1);
  EXPECT_EQ(document["components"]["schemas"]["Size"]["type"], "integer");
  EXPECT_TRUE(document["components"]["schemas"].isMember("Failure"));
}

TEST(OpenApi, JoinsTheCodesOfAMethodWithThoseOfTheServer) {
  const Json::Value document = DocumentOf({Describe("A", kDescriptor)});
  const Json::Value& set = document["paths"]["/api/A/v1/set"]["post"];
  const Json::Value& error = SchemaOf(set, "400")["properties"]["error"]["properties"];
  EXPECT_THAT(std::vector<Json::Value>(error["code"]["enum"].begin(), error["code"]["enum"].end()),
              ElementsAre(2301, 400));
  EXPECT_EQ(error["details"]["type"], "integer");
  EXPECT_THAT(set["responses"]["400"]["description"].asString(), HasSubstr("2301: Wrong size. 400: The request"));
  EXPECT_EQ(SchemaOf(set, "500")["properties"]["error"]["properties"]["code"]["enum"].size(), 1U);
  EXPECT_EQ(set["responses"]["503"]["$ref"], "#/components/responses/Status503");
  EXPECT_FALSE(set["responses"].isMember("405")) << "a described path is called with POST";
}

TEST(OpenApi, DescribesRevisionsWhereTheyArePossible) {
  const Json::Value document = DocumentOf({Describe("A", kDescriptor)});
  const Json::Value& get = document["paths"]["/api/A/v1/get"]["post"];
  const Json::Value& set = document["paths"]["/api/A/v1/set"]["post"];
  EXPECT_TRUE(get["responses"]["200"]["headers"].isMember("ETag"));
  EXPECT_FALSE(get["responses"].isMember("412"));
  EXPECT_FALSE(get.isMember("parameters"));
  EXPECT_TRUE(set["responses"].isMember("412"));
  EXPECT_EQ(set["parameters"][0]["$ref"], "#/components/parameters/IfMatch");
}

TEST(OpenApi, DescribesRehearsalsOfChangingMethods) {
  const Json::Value document = DocumentOf({Describe("A", kDescriptor)});
  const Json::Value& get = document["paths"]["/api/A/v1/get"]["post"];
  const Json::Value& set = document["paths"]["/api/A/v1/set"]["post"];
  EXPECT_EQ(set["parameters"][1]["$ref"], "#/components/parameters/Rehearse");
  EXPECT_EQ(SchemaOf(set, "200")["properties"]["rehearsal"]["$ref"], "#/components/schemas/Rehearsal");
  EXPECT_EQ(SchemaOf(set, "500")["properties"]["rehearsal"]["$ref"], "#/components/schemas/Rehearsal");
  EXPECT_FALSE(SchemaOf(get, "200")["properties"].isMember("rehearsal"));
  EXPECT_TRUE(document["components"]["schemas"]["Rehearsal"].isObject());
}

TEST(OpenApi, HasOnlyMethodsThatCanBeCalled) {
  const Json::Value document = DocumentOf({Describe("A", kDescriptor)});
  EXPECT_FALSE(document["paths"].isMember("/api/A/v1/absent"));
  EXPECT_FALSE(document["paths"].isMember("/api/A/v1/undescribed"));
}

TEST(OpenApi, LeavesOutAModuleWithASchemaOfTheSameName) {
  const std::string same = R"({"paths": {"/api/B/v1/get": {"post": {}}},
      "components": {"schemas": {"Size": {"type": "integer"}}}})";
  const std::string other = R"({"paths": {"/api/B/v1/get": {"post": {}}},
      "components": {"schemas": {"Large": {"type": "string"}, "Size": {"type": "string"}}}})";
  const std::string of_server = R"({"paths": {"/api/B/v1/get": {"post": {}}},
      "components": {"schemas": {"Failure": {"type": "string"}}}})";
  EXPECT_TRUE(DocumentOf({Describe("A", kDescriptor), Describe("B", same)})["paths"].isMember("/api/B/v1/get"));
  for (const std::string& descriptor : {other, of_server}) {
    testing::internal::CaptureStderr();
    openlog("test", LOG_PERROR, LOG_USER);
    const Json::Value document = DocumentOf({Describe("A", kDescriptor), Describe("B", descriptor)});
    closelog();
    EXPECT_THAT(testing::internal::GetCapturedStderr(), HasSubstr("B.so: left out of /openapi.json"));
    EXPECT_FALSE(document["paths"].isMember("/api/B/v1/get"));
    EXPECT_FALSE(document["components"]["schemas"].isMember("Large"));
    EXPECT_TRUE(document["paths"].isMember("/api/A/v1/get"));
  }
}

class OwnMethods : public testing::Test {
 protected:
  OwnMethods() { AddServerMethods(tokens_, sessions_, &routes_); }

  const Sandbox sandbox_;
  const std::vector<Module> none_;
  TokenStore tokens_{sandbox_.File("tokens.json")};
  Sessions sessions_{Sessions::Limits{}};
  Routes routes_{none_};
};

TEST_F(OwnMethods, AreAllDescribed) {
  const Json::Value document = OpenApiDocument(routes_);
  EXPECT_EQ(routes_.List().size(), 8U);
  EXPECT_EQ(ServerDescriptor().Paths().size(), 8U);
  for (const Json::Value& row : routes_.List()) {
    const std::string path = "/api/" + row["api"].asString() + "/v1/" + row["method"].asString();
    EXPECT_TRUE(document["paths"][path].isMember("post")) << path;
  }
}

// The reading methods of administrators are not for readers, so the descriptor alone does not say who may call.
TEST_F(OwnMethods, TellWhetherTheyOnlyRead) {
  std::string unknown;
  for (const char* path : {"Session/v1/get", "Session/v1/list", "Token/v1/list"}) {
    EXPECT_TRUE(routes_.Find(std::string("/api/VORN.Server.") + path, &unknown)->method.reads_only) << path;
  }
  for (const char* path : {"Session/v1/sign_out", "Session/v1/end", "Token/v1/create", "Token/v1/revoke"}) {
    EXPECT_FALSE(routes_.Find(std::string("/api/VORN.Server.") + path, &unknown)->method.reads_only) << path;
  }
}

TEST_F(OwnMethods, NeedCredentialsExceptToSignIn) {
  const Json::Value document = OpenApiDocument(routes_);
  EXPECT_EQ(document["security"].size(), 2U);
  std::set<std::string> open;
  for (const std::string& path : document["paths"].getMemberNames()) {
    for (const Json::Value& operation : document["paths"][path]) {
      if (!operation.isMember("security")) continue;
      EXPECT_EQ(operation["security"], Json::Value(Json::arrayValue)) << path;
      open.insert(path);
    }
  }
  EXPECT_THAT(open, ElementsAre("/api/VORN.Server.Session/v1/sign_in", "/docs", "/healthz", "/healthz/live",
                                "/healthz/ready", "/openapi.json"));
}

TEST_F(OwnMethods, HideTheirSecretsFromTheLog) {
  Json::Value parameters;
  for (const char* name : {"account", "password", "code", "unknown"}) parameters[name] = name;
  EXPECT_THAT(ServerDescriptor().Unlogged(std::string(kSignInPath), parameters),
              ElementsAre("code", "password", "unknown"));
}

// A status that the server also answers to all methods is listed once.
TEST_F(OwnMethods, HaveEachErrorCodeOnce) {
  const Json::Value document = OpenApiDocument(routes_);
  const Json::Value& responses = document["paths"][std::string(kSignInPath)]["post"]["responses"];
  const Json::Value& code =
      responses["400"]["content"]["application/json"]["schema"]["properties"]["error"]["properties"]["code"];
  EXPECT_EQ(code["enum"].size(), 1U);
  EXPECT_TRUE(responses.isMember("429"));
  for (const std::string& number : ServerDescriptor().document()["x-error-codes"].getMemberNames()) {
    const Json::Value& status = document["components"]["responses"]["Status" + number];
    if (status.isNull()) continue;
    EXPECT_EQ(ServerDescriptor().Describe(std::stoi(number)).text, status["description"].asString());
  }
}

// Returns the statuses of the refusals in the sources of the server.
std::set<std::string> StatusesOfSources() {
  const std::regex refusal(R"((?:Refusal|Refuse|Failure|Fail|fault|Fault)[({](\d{3})\b)");
  std::set<std::string> statuses{"503"};  // Busy()
  for (const auto& file : std::filesystem::recursive_directory_iterator(SERVER_SOURCES)) {
    if (file.path().extension() != ".cpp") continue;
    const std::string text = ReadWholeFile(file.path());
    for (std::sregex_iterator hit(text.begin(), text.end(), refusal), end; hit != end; ++hit) {
      statuses.insert((*hit)[1]);
    }
  }
  return statuses;
}

TEST(OpenApi, HasEveryStatusThatTheServerAnswers) {
  std::set<std::string> described;
  const Json::Value document = DocumentOf({});
  for (const std::string& name : document["components"]["responses"].getMemberNames()) {
    described.insert(name.substr(std::string("Status").size()));
  }
  EXPECT_THAT(described, ContainerEq(StatusesOfSources()));
}

TEST(Docs, DescribeEveryMethodAndEveryCode) {
  const Module module = Describe("A", ReadWholeFile(NFS_DESCRIPTOR));
  const std::string page(kDocsPage);
  for (const Descriptor* descriptor : {&module.descriptor, &ServerDescriptor()}) {
    for (const std::string& path : descriptor->Paths()) {
      EXPECT_THAT(page, HasSubstr(">" + path.substr(std::string("/api/").size()) + "</h3>"));
    }
    for (const std::string& code : descriptor->document()["x-error-codes"].getMemberNames()) {
      EXPECT_THAT(page, HasSubstr("id=\"error-" + code + "\""));
      EXPECT_THAT(page, HasSubstr("href=\"#error-" + code + "\""));
    }
  }
  EXPECT_EQ(page.find("<script"), std::string::npos);
  EXPECT_EQ(page.find("style="), std::string::npos);
}

}  // namespace
}  // namespace vorn::server
