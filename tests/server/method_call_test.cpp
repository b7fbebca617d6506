#include "method_call.h"

#include <gmock/gmock.h>
#include <syslog.h>

#include <atomic>
#include <chrono>
#include <deque>
#include <future>
#include <memory>
#include <mutex>
#include <new>
#include <stdexcept>
#include <thread>
#include <utility>

#include "sandbox.h"
#include "secret.h"

namespace vorn::server {
namespace {

using std::chrono::milliseconds;
using testing::HasSubstr;
using testing::Not;

void Echo(VORN::APIRequest* request, VORN::APIResponse* response) {
  response->SetSuccess(request->GetParam("", Json::Value()));
}
void Silent(VORN::APIRequest* /*request*/, VORN::APIResponse* /*response*/) {}
void Throw(VORN::APIRequest* /*request*/, VORN::APIResponse* /*response*/) { throw std::runtime_error("reason"); }
void ThrowNumber(VORN::APIRequest* /*request*/, VORN::APIResponse* /*response*/) { throw 7; }
void AnswerThenThrow(VORN::APIRequest* /*request*/, VORN::APIResponse* response) {
  response->SetSuccess("half done");
  throw std::bad_alloc();
}

// A body that reports its destruction.
class TracedBody : public Body {
 public:
  explicit TracedBody(std::atomic<bool>* gone) : Body(1, JsonBody::TooLarge), gone_(gone) {}
  ~TracedBody() override { *gone_ = true; }
  std::variant<Json::Value, Response> TakeParameters() override { return Json::Value(Json::objectValue); }

 private:
  std::atomic<bool>* gone_;
};

// A body with these parameters.
class FixedBody : public Body {
 public:
  FixedBody() : Body(1, JsonBody::TooLarge) {}
  std::variant<Json::Value, Response> TakeParameters() override { return parameters; }
  Json::Value parameters{Json::objectValue};
};

// A body whose parameters cannot be allocated.
class FailingBody : public Body {
 public:
  FailingBody() : Body(1, JsonBody::TooLarge) {}
  std::variant<Json::Value, Response> TakeParameters() override { throw std::bad_alloc(); }
};

std::atomic<bool> held{false};  // whether Hold goes on
std::atomic<int> held_calls{0};
void Hold(VORN::APIRequest* /*request*/, VORN::APIResponse* response) {
  ++held_calls;
  while (held) std::this_thread::sleep_for(milliseconds(1));
  response->SetSuccess("late");
}

class CallTest : public testing::Test {
 protected:
  CallTest() {
    held = false;
    held_calls = 0;
  }
  ~CallTest() override { held = false; }

  std::shared_ptr<Call> NewCall(const Route& route, milliseconds deadline = std::chrono::hours(1)) {
    return std::make_shared<Call>(Call::Request{route, std::make_shared<Caller>(), "unix", {}},
                                  std::make_unique<TracedBody>(&gone_),
                                  Call::Environment{pool_, audit_, metrics_, deadline});
  }
  // Runs the call. The future receives its answer.
  std::future<Response> Run(const std::shared_ptr<Call>& call) {
    const auto promise = std::make_shared<std::promise<Response>>();
    call->Run([promise](Response response) { promise->set_value(std::move(response)); });
    pool_.Wake();
    return promise->get_future();
  }

  static WorkerPool::Limits OneOfALane() {
    WorkerPool::Limits limits;
    limits.lane_threads = 1;
    limits.lane_queue = 1;
    return limits;
  }

  const Descriptor descriptor_;
  const Route echo_{{"Api", 1, "echo", Echo}, &descriptor_, {}};
  const Route hold_{{"Api", 1, "hold", Hold}, &descriptor_, {}};
  std::deque<Route> routes_;  // a worker uses its route until it has counted the answer
  std::atomic<bool> gone_ = false;
  CallMetrics metrics_;
  std::mutex mutex_;
  std::vector<AuditRecord> audited_;
  const AuditSink audit_ = [this](const AuditRecord& record) {
    const std::lock_guard<std::mutex> lock(mutex_);
    audited_.push_back(record);
  };
  WorkerPool pool_{OneOfALane()};
};

TEST_F(CallTest, ReleasesItsBodyBeforeItAnswers) {
  const auto gone_at_answer = std::make_shared<std::promise<bool>>();
  NewCall(echo_)->Run([this, gone_at_answer](const Response& /*response*/) { gone_at_answer->set_value(gone_); });
  pool_.Wake();
  EXPECT_TRUE(gone_at_answer->get_future().get());
}

TEST_F(CallTest, IsRefusedWhenTooManyWait) {
  held = true;
  auto running = Run(NewCall(hold_));
  ASSERT_TRUE(Eventually([] { return held_calls == 1; }));
  auto waiting = Run(NewCall(hold_));
  const Response refused = Run(NewCall(hold_)).get();
  EXPECT_EQ(refused.status, 503);
  ASSERT_EQ(refused.headers.size(), 1U);
  EXPECT_EQ(refused.headers[0].first, "Retry-After");
  held = false;
  EXPECT_EQ(running.get().status, 200);
  EXPECT_EQ(waiting.get().status, 200);
}

TEST_F(CallTest, IsAnsweredAtItsDeadline) {
  held = true;
  auto running = Run(NewCall(hold_, std::chrono::seconds(2)));  // long enough for a worker to begin
  EXPECT_EQ(running.get().status, 504);
  EXPECT_EQ(held_calls, 1);
  auto waiting = Run(NewCall(hold_, milliseconds(1)));
  EXPECT_EQ(waiting.get().status, 503) << "it has done nothing";
  held = false;
  EXPECT_EQ(Run(NewCall(echo_)).get().status, 200);
  EXPECT_EQ(held_calls, 1);
}

TEST_F(CallTest, ThatEndsAfterItsDeadlineIsLoggedAndRecordedWhenItEnds) {
  testing::internal::CaptureStderr();
  openlog("test", LOG_PERROR, LOG_USER);
  held = true;
  EXPECT_EQ(Run(NewCall(hold_, std::chrono::seconds(2))).get().status, 504);
  const std::string before = testing::internal::GetCapturedStderr();
  testing::internal::CaptureStderr();
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    EXPECT_TRUE(audited_.empty());
  }
  held = false;
  EXPECT_TRUE(Eventually([this] { return pool_.load().running == 0; }));
  closelog();
  const std::string after = testing::internal::GetCapturedStderr();
  EXPECT_THAT(before, HasSubstr("Api v1 hold: not done at its deadline"));
  EXPECT_THAT(before, Not(HasSubstr("ended")));
  EXPECT_THAT(after, HasSubstr("Api v1 hold: ended with status 200 after its deadline"));
  ASSERT_EQ(audited_.size(), 1U);
  EXPECT_EQ(audited_[0].status, 200) << "the outcome, not the answer that the client has seen";
}

TEST_F(CallTest, OfAClientThatHasLeftIsNotRun) {
  held = true;
  auto running = Run(NewCall(hold_));
  ASSERT_TRUE(Eventually([] { return held_calls == 1; }));
  const auto abandoned = NewCall(hold_);
  auto answer = Run(abandoned);
  abandoned->Abandon();
  held = false;
  answer.get();
  EXPECT_EQ(held_calls, 1);
}

TEST_F(CallTest, IsAnsweredWhenThereIsNoMemoryForItsParameters) {
  const auto call = std::make_shared<Call>(Call::Request{echo_, std::make_shared<Caller>(), "unix", {}},
                                           std::make_unique<FailingBody>(),
                                           Call::Environment{pool_, audit_, metrics_, std::chrono::hours(1)});
  EXPECT_EQ(Run(call).get().status, 500);
}

TEST_F(CallTest, ThatMayChangeSomethingIsRecordedBeforeItsAnswer) {
  const auto records_at_answer = std::make_shared<std::promise<std::size_t>>();
  Caller caller;
  caller.name = "alice";
  Call::Request request{echo_, std::make_shared<Caller>(caller), "unix", {}};
  std::make_shared<Call>(std::move(request), std::make_unique<TracedBody>(&gone_),
                         Call::Environment{pool_, audit_, metrics_, std::chrono::hours(1)})
      ->Run([this, records_at_answer](const Response& /*response*/) { records_at_answer->set_value(audited_.size()); });
  pool_.Wake();
  ASSERT_EQ(records_at_answer->get_future().get(), 1U);
  EXPECT_EQ(audited_[0].caller, "alice");
  EXPECT_EQ(audited_[0].origin, "unix");
  EXPECT_EQ(audited_[0].method, "Api/v1/echo");
  EXPECT_EQ(audited_[0].parameters, "{}");
  EXPECT_EQ(audited_[0].status, 200);
  EXPECT_EQ(audited_[0].code, 0);
}

TEST_F(CallTest, ThatFailsIsRecordedWithItsCode) {
  routes_.push_back({{"Api", 1, "method", Throw}, &descriptor_, {}});
  Run(NewCall(routes_.back())).get();
  ASSERT_EQ(audited_.size(), 1U);
  EXPECT_EQ(audited_[0].status, 500);
  EXPECT_EQ(audited_[0].code, 2302);
}

TEST_F(CallTest, ThatOnlyReadsIsNotRecorded) {
  routes_.push_back(echo_);
  routes_.back().method.reads_only = true;
  Run(NewCall(routes_.back())).get();
  EXPECT_TRUE(audited_.empty());
}

TEST_F(CallTest, IsRecordedWithoutItsSecrets) {
  std::string error;
  const auto descriptor = Descriptor::Parse(R"({"paths": {"/api/Api/v1/echo": {"post": {"requestBody": {"content": {
      "application/json": {"schema": {"properties": {"name": {}, "password": {"writeOnly": true}}}}}}}}}})",
                                            &error);
  ASSERT_TRUE(descriptor) << error;
  const Route& route = routes_.emplace_back(Route{{"Api", 1, "echo", Echo}, &*descriptor, {}});
  auto body = std::make_unique<FixedBody>();
  body->parameters["password"] = "secret";
  body->parameters["name"] = "alice";
  body->parameters["pasword"] = "secret";
  const auto call =
      std::make_shared<Call>(Call::Request{route, std::make_shared<Caller>(), "unix", {}}, std::move(body),
                             Call::Environment{pool_, audit_, metrics_, std::chrono::hours(1)});
  EXPECT_NE(Run(call).get().body.find("secret"), std::string::npos) << "the method has the secret";
  ASSERT_EQ(audited_.size(), 1U);
  EXPECT_EQ(audited_[0].parameters, R"json({"name":"alice","password":"(left out)","pasword":"(left out)"})json");
}

TEST_F(CallTest, IsRefusedWithASecretInItsParameters) {
  auto body = std::make_unique<FixedBody>();
  body->parameters["rule"][0]["client"] = "a " + NewSecret(kTokenPrefix);
  const auto call =
      std::make_shared<Call>(Call::Request{echo_, std::make_shared<Caller>(), "unix", {}}, std::move(body),
                             Call::Environment{pool_, audit_, metrics_, std::chrono::hours(1)});
  const Response refused = Run(call).get();
  EXPECT_EQ(refused.status, 400);
  EXPECT_EQ(refused.body.find(kTokenPrefix), std::string::npos) << refused.body;
  ASSERT_EQ(audited_.size(), 1U);
  EXPECT_EQ(audited_[0].parameters, "");
}

TEST_F(CallTest, IsAnsweredWhenItsMethodDoesNotAnswer) {
  for (const auto handler : {Silent, Throw, ThrowNumber, AnswerThenThrow}) {
    routes_.push_back({{"Api", 1, "method", handler}, &descriptor_, {}});
    const Response response = Run(NewCall(routes_.back())).get();
    EXPECT_EQ(response.status, 500);
    EXPECT_NE(response.body.find("\"code\":2302"), std::string::npos) << response.body;
  }
}

}  // namespace
}  // namespace vorn::server
