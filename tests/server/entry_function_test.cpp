#include "entry_function.h"

#include <gtest/gtest.h>

#include <stdexcept>

#include "entity_tag.h"
#include "module.h"

namespace vorn::server {
namespace {

Json::Value ParametersOf(const VORN::APIRequest& request) { return request.GetParam("", Json::Value()); }

void Echo(VORN::APIRequest* request, VORN::APIResponse* response) { response->SetSuccess(ParametersOf(*request)); }
void Fail(VORN::APIRequest* /*request*/, VORN::APIResponse* response) { response->SetError(2351, "alice"); }
void Silent(VORN::APIRequest* /*request*/, VORN::APIResponse* /*response*/) {}

void AddRemarks(VORN::APIRequest* request, VORN::APIResponse* response) {
  VORN::CallContext::Current()->AddReason("10.0.0.256 is not an address.");
  VORN::CallContext::Current()->AddWarning("The reload failed.");
  request->GetParam("fail", false).asBool() ? response->SetError(2351, {}) : response->SetSuccess({});
}

// A number for each of two subjects. Load shows it, and Save changes it.
Json::Value stored(Json::objectValue);
bool load_fails = false;

void Load(VORN::APIRequest* request, VORN::APIResponse* response) {
  if (VORN::CallContext::Current()->description().may_write) throw std::runtime_error("this call only reads");
  if (load_fails) return response->SetError(2351, {});
  response->SetSuccess(stored[request->GetParam("name", "").asString()]);
}

void Save(VORN::APIRequest* request, VORN::APIResponse* response) {
  stored[request->GetParam("name", "").asString()] = request->GetParam("value", 0);
  response->SetSuccess({});
}

Json::Value Parameters(const std::string& name, const Json::Value& value = {}) {
  Json::Value parameters(Json::objectValue);
  parameters["name"] = name;
  if (!value.isNull()) parameters["value"] = value;
  return parameters;
}

std::string TagOf(const Response& response) {
  for (const auto& [name, value] : response.headers) {
    if (name == "ETag") return value;
  }
  return "";
}

class EntryFunction : public testing::Test {
 protected:
  EntryFunction() {
    stored = Json::objectValue;
    stored["a"] = 1;
    stored["b"] = 2;
    load_fails = false;
  }

  static Descriptor ParseDescriptor() {
    std::string error;
    auto descriptor = Descriptor::Parse(R"({
        "paths": {
          "/api/Api/v1/load": {"post": {"x-read-only": true}},
          "/api/Api/v1/save": {"post": {"x-shown-by": {"method": "Api/v1/load", "same": ["name"]}}}},
        "x-error-codes": {"2351": {"status": 409, "text": "There."}}})",
                                        &error);
    if (!descriptor) throw std::runtime_error(error);
    return *descriptor;
  }

  const Route& RouteOf(const std::string& method) const {
    std::string unknown;
    const Route* route = routes_.Find("/api/Api/v1/" + method, &unknown);
    if (route == nullptr) throw std::runtime_error(unknown);
    return *route;
  }
  Response Run(const std::string& method, const Json::Value& parameters = Json::objectValue) const {
    VORN::CallDescription description;
    description.may_write = !RouteOf(method).method.reads_only;
    return RunAndAnswer(RouteOf(method), parameters, description);
  }
  Response SaveIfMatch(const std::string& condition, const Json::Value& parameters) const {
    return RunIfUnchanged(RouteOf("save"), parameters, {}, condition);
  }
  std::string TagOfLoaded(const std::string& name) const { return TagOf(Run("load", Parameters(name))); }

  const std::vector<Module> modules_{{"a.so",
                                      {{"Api", 1, "echo", Echo},
                                       {"Api", 1, "fail", Fail},
                                       {"Api", 1, "silent", Silent},
                                       {"Api", 1, "remark", AddRemarks},
                                       {"Api", 1, "load", Load},
                                       {"Api", 1, "save", Save}},
                                      ParseDescriptor()}};
  const Routes routes_{modules_};
};

TEST_F(EntryFunction, AnswersWithItsData) {
  const Response response = Run("echo", Parameters("x"));
  EXPECT_EQ(response.body, R"({"success":true,"data":{"name":"x"}})");
  EXPECT_EQ(TagOf(response), "") << "this method is not described as reading";
}

TEST_F(EntryFunction, FailsWithStatusAndTextOfItsCode) {
  const Response response = Run("fail");
  EXPECT_EQ(response.status, 409);
  EXPECT_EQ(response.body, R"({"success":false,"error":{"code":2351,"text":"There.","details":"alice"}})");
}

TEST_F(EntryFunction, ThatDoesNotAnswerThrows) { EXPECT_THROW(Run("silent"), std::runtime_error); }

TEST_F(EntryFunction, IsAnsweredWithTheRemarksOfItsContext) {
  EXPECT_EQ(Run("remark").body, R"({"success":true,"data":null,"warnings":["The reload failed."]})");
  Json::Value parameters;
  parameters["fail"] = true;
  EXPECT_EQ(Run("remark", parameters).body,
            R"({"success":false,"error":{"code":2351,"text":"There.","reasons":["10.0.0.256 is not an address."]},)"
            R"("warnings":["The reload failed."]})");
  EXPECT_EQ(VORN::CallContext::Current(), nullptr);
}

TEST_F(EntryFunction, TellsRemarksOnlyToThoseWhoMaySeeThem) {
  VORN::CallDescription description;
  description.sees_remarks = false;
  const Route& route = RouteOf("remark");
  Json::Value parameters(Json::objectValue);
  EXPECT_EQ(RunAndAnswer(route, parameters, description).body, R"({"success":true,"data":null})");
  parameters["fail"] = true;
  EXPECT_EQ(RunAndAnswer(route, parameters, description).body,
            R"({"success":false,"error":{"code":2351,"text":"There."}})");
}

void RefuseParameters(VORN::APIRequest* request, VORN::APIResponse* response) {
  if (request->GetParam("explain", false).asBool()) VORN::CallContext::Current()->AddReason("Too large.");
  response->SetError(request->GetParam("code", 0).asInt(), {});
}

TEST_F(EntryFunction, IsAnsweredWithTheFaultyParameters) {
  std::string error;
  const auto descriptor = Descriptor::Parse(R"({
      "x-error-codes": {"2301": {"status": 400, "text": "Wrong.", "parameters": true},
                        "2302": {"status": 500, "text": "Failed."}},
      "paths": {"/api/Api/v1/method": {"post": {"requestBody": {"content": {"application/json": {"schema": {
          "required": ["size"]}}}}}}}})",
                                            &error);
  ASSERT_TRUE(descriptor) << error;
  const auto run = [&descriptor](int code, bool explain) {
    Json::Value parameters;
    parameters["code"] = code;
    parameters["explain"] = explain;
    return RunAndAnswer({{"Api", 1, "method", RefuseParameters}, &*descriptor, {}}, parameters, {}).body;
  };
  EXPECT_EQ(run(2301, false),
            R"({"success":false,"error":{"code":2301,"text":"Wrong.","reasons":["\"size\" is missing."]}})");
  EXPECT_EQ(run(2301, true), R"({"success":false,"error":{"code":2301,"text":"Wrong.","reasons":["Too large."]}})")
      << "the platform's own reasons come alone";
  EXPECT_EQ(run(2302, false), R"({"success":false,"error":{"code":2302,"text":"Failed."}})");
}

TEST_F(EntryFunction, ThatReadsHasATagOfItsData) {
  const std::string tag = TagOfLoaded("a");
  EXPECT_EQ(tag, TagOfLoaded("a"));
  stored["a"] = 7;
  EXPECT_NE(tag, TagOfLoaded("a"));
  load_fails = true;
  EXPECT_EQ(TagOfLoaded("a"), "");
}

TEST_F(EntryFunction, AppliesAChangeIfTheTagIsCurrent) {
  EXPECT_EQ(SaveIfMatch(TagOfLoaded("a"), Parameters("a", 5)).status, 200);
  EXPECT_EQ(stored["a"], 5);
}

TEST_F(EntryFunction, RefusesAChangeIfTheDataChangedMeanwhile) {
  const std::string tag = TagOfLoaded("a");
  stored["a"] = 3;
  const Response refused = SaveIfMatch(tag, Parameters("a", 5));
  EXPECT_EQ(refused.status, 412);
  EXPECT_EQ(refused.body,
            R"({"success":false,"error":{"code":412,"text":"This was changed meanwhile. The details are what is there )"
            R"(now.","details":3}})");
  EXPECT_EQ(stored["a"], 3);
  EXPECT_EQ(SaveIfMatch(TagOf(refused), Parameters("a", 5)).status, 200) << "the refusal has the present tag";
}

TEST_F(EntryFunction, RefusesATagOfAnotherSubject) {
  stored["b"] = 1;
  const Response refused = SaveIfMatch(TagOfLoaded("b"), Parameters("a", 5));
  EXPECT_EQ(refused.status, 412);
  EXPECT_EQ(TagOf(refused), TagOfLoaded("a"));
}

TEST_F(EntryFunction, AcceptsAnyOfSeveralTags) {
  const std::string old = TagOfLoaded("a");
  stored["a"] = 3;
  EXPECT_EQ(SaveIfMatch(old + ", " + TagOfLoaded("a"), Parameters("a", 5)).status, 200);
  EXPECT_EQ(SaveIfMatch("*", Parameters("a", 6)).status, 200);
  EXPECT_EQ(stored["a"], 6);
}

TEST_F(EntryFunction, RefusesATagThatThisServerHasNotMade) {
  for (const std::string& condition : {std::string(), std::string("\"\""), std::string("\"x.%\""), std::string("a"),
                                       "W/" + TagOfLoaded("a"), std::string("\"x.e30\"")}) {
    EXPECT_EQ(SaveIfMatch(condition, Parameters("a", 5)).status, 412) << condition;
  }
  EXPECT_EQ(stored["a"], 1);
}

TEST_F(EntryFunction, AnswersTheFailureOfTheReading) {
  const std::string tag = TagOfLoaded("a");
  load_fails = true;
  EXPECT_EQ(SaveIfMatch(tag, Parameters("a", 5)).status, 409);
  EXPECT_EQ(stored["a"], 1);
}

}  // namespace
}  // namespace vorn::server
