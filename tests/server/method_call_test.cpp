#include "method_call.h"

#include <gtest/gtest.h>

#include <future>
#include <stdexcept>

namespace vorn::server {
namespace {

void Echo(VORN::APIRequest* request, VORN::APIResponse* response) {
  response->SetSuccess(request->GetParam("", Json::Value()));
}
void Fail(VORN::APIRequest* /*request*/, VORN::APIResponse* response) { response->SetError(2351, "alice"); }
void Silent(VORN::APIRequest* /*request*/, VORN::APIResponse* /*response*/) {}
void Throw(VORN::APIRequest* /*request*/, VORN::APIResponse* /*response*/) { throw std::runtime_error("reason"); }
void ThrowNumber(VORN::APIRequest* /*request*/, VORN::APIResponse* /*response*/) { throw 7; }
void AnswerThenThrow(VORN::APIRequest* /*request*/, VORN::APIResponse* response) {
  response->SetSuccess("half done");
  throw std::bad_alloc();
}

Response RunHandler(decltype(APIRow::handler) handler, const Json::Value& parameters = Json::objectValue) {
  std::string error;
  const auto descriptor = Descriptor::Parse(R"({"x-error-codes":{"2351":{"status":409,"text":"There."}}})", &error);
  return RunEntryFunction({{"Api", 1, "method", handler}, &*descriptor, {}}, parameters, {});
}

TEST(EntryFunction, AnswersWithItsData) {
  Json::Value parameters;
  parameters["a"] = 1;
  EXPECT_EQ(RunHandler(Echo, parameters).body, R"({"success":true,"data":{"a":1}})");
}

TEST(EntryFunction, FailsWithStatusAndTextOfItsCode) {
  const Response response = RunHandler(Fail);
  EXPECT_EQ(response.status, 409);
  EXPECT_EQ(response.body, R"({"success":false,"error":{"code":2351,"text":"There.","details":"alice"}})");
}

TEST(EntryFunction, IsAnsweredForWhenItDoesNotAnswer) {
  for (const auto handler : {Silent, Throw, ThrowNumber, AnswerThenThrow}) {
    const Response response = RunHandler(handler);
    EXPECT_EQ(response.status, 500);
    EXPECT_NE(response.body.find("\"code\":2302"), std::string::npos) << response.body;
  }
}

void AddRemarks(VORN::APIRequest* request, VORN::APIResponse* response) {
  VORN::CallContext::Current()->AddReason("10.0.0.256 is not an address.");
  VORN::CallContext::Current()->AddWarning("The reload failed.");
  request->GetParam("fail", false).asBool() ? response->SetError(2351, {}) : response->SetSuccess({});
}

TEST(EntryFunction, IsAnsweredWithTheRemarksOfItsContext) {
  EXPECT_EQ(RunHandler(AddRemarks).body, R"({"success":true,"data":null,"warnings":["The reload failed."]})");
  Json::Value parameters;
  parameters["fail"] = true;
  EXPECT_EQ(RunHandler(AddRemarks, parameters).body,
            R"({"success":false,"error":{"code":2351,"text":"There.","reasons":["10.0.0.256 is not an address."]},)"
            R"("warnings":["The reload failed."]})");
  EXPECT_EQ(VORN::CallContext::Current(), nullptr);
}

// A body that tells when it is gone.
class TracedBody : public Body {
 public:
  explicit TracedBody(bool* gone) : gone_(gone) {}
  ~TracedBody() override { *gone_ = true; }
  std::optional<Response> Receive(std::string_view /*piece*/) override { return std::nullopt; }
  std::variant<Json::Value, Response> TakeParameters() override { return Json::Value(Json::objectValue); }

 private:
  bool* gone_;
};

TEST(Call, ReleasesItsBodyBeforeItAnswers) {
  const Descriptor descriptor;
  const Route route{{"Api", 1, "echo", Echo}, &descriptor, {}};
  WorkerPool pool({1, 1, 1});
  bool gone = false;
  std::promise<bool> gone_at_answer;
  const auto call = std::make_shared<Call>(route, std::make_unique<TracedBody>(&gone), VORN::CallDescription{}, pool);
  call->Run([&](const Response& /*response*/) { gone_at_answer.set_value(gone); });
  EXPECT_TRUE(gone_at_answer.get_future().get());
}

TEST(Call, IsRefusedWhenTooManyWait) {
  const Descriptor descriptor;
  const Route route{{"Api", 1, "echo", Echo}, &descriptor, {}};
  WorkerPool pool({1, 1, 0});
  Response answer;
  std::make_shared<Call>(route, std::make_unique<JsonBody>(), VORN::CallDescription{}, pool)
      ->Run([&](Response response) { answer = std::move(response); });
  EXPECT_EQ(answer.status, 503);
  ASSERT_EQ(answer.headers.size(), 1U);
  EXPECT_EQ(answer.headers[0].first, "Retry-After");
}

}  // namespace
}  // namespace vorn::server
