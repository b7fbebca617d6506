#include "handler.h"

#include <gmock/gmock.h>

#include "fake_platform.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

// Makes the protected members of the base class public.
class Handler : public ServiceHandler {
 public:
  using ServiceHandler::AnswerTo;
  using ServiceHandler::AnswerWith;
  using ServiceHandler::Fail;
  using ServiceHandler::ServiceHandler;
};

constexpr CallSite kSite{"somewhere", 7};

// Runs `action` on a new handler as one request.
template <typename Action>
Answer Handle(const char* params, Action action) {
  return Call(
      [&](VORN::APIRequest* request, VORN::APIResponse* response) {
        Handler handler(request, response);
        action(handler);
      },
      params);
}

TEST(ServiceHandler, ReportsTheFirstOfTwoErrors) {
  FakePlatform platform;
  const Answer answer = Handle("{}", [](Handler& handler) {
    handler.SetError(2301);
    handler.SetError(2302);
    handler.ReportError();
  });
  EXPECT_EQ(answer.code, 2301);
  EXPECT_TRUE(answer.data.isNull());
  EXPECT_THAT(platform.log, IsEmpty());
}

TEST(ServiceHandler, RecordsNothingForCodeZero) {
  FakePlatform platform;
  const Answer answer = Handle("{}", [](Handler& handler) {
    handler.SetError(0);
    handler.SetError(2353);
    handler.ReportError();
  });
  EXPECT_EQ(answer.code, 2353);
}

TEST(ServiceHandler, ReportsAPlatformFailureWhenNoErrorIsRecorded) {
  FakePlatform platform;
  const Answer answer = Handle("{}", [](Handler& handler) { handler.ReportError(); });
  EXPECT_EQ(answer.code, 2302);
  ASSERT_EQ(platform.log.size(), 1U);
  EXPECT_EQ(platform.log[0].priority, 3);
  EXPECT_EQ(platform.log[0].source, "handler");
  EXPECT_GT(platform.log[0].line, 0);
  EXPECT_EQ(platform.log[0].text, "There is no error setup");
}

TEST(ServiceHandler, PassesErrorDetailsThrough) {
  FakePlatform platform;
  const Answer answer = Handle("{}", [](Handler& handler) {
    Json::Value details;
    details["principal_conflict"].append("a@B");
    handler.SetError(2351);
    handler.ReportError(details);
  });
  EXPECT_EQ(answer.code, 2351);
  EXPECT_EQ(answer.data, Parse(R"({"principal_conflict": ["a@B"]})"));
}

TEST(ServiceHandler, ReportsSuccessWithAndWithoutData) {
  FakePlatform platform;
  EXPECT_EQ(Handle("{}", [](Handler& handler) { handler.ReportSuccess(5); }).data, Json::Value(5));
  EXPECT_TRUE(Handle("{}", [](Handler& handler) { handler.ReportSuccess(); }).data.isNull());
}

TEST(ServiceHandler, FailsWithTheFirstCode) {
  FakePlatform platform;
  const Answer answer = Handle("{}", [](Handler& handler) {
    EXPECT_FALSE(handler.Fail(2303));
    EXPECT_FALSE(handler.Fail(2302));
    handler.ReportError();
  });
  EXPECT_EQ(answer.code, 2303);
}

TEST(AnswerWith, AnswersWithWhatWasGatheredAndReadsNoParameters) {
  FakePlatform platform;
  const Answer answer = Handle(R"({"x": 1})", [](Handler& handler) {
    handler.AnswerWith(kSite, [](Json::Value& result) {
      EXPECT_TRUE(result.isNull());
      result["key"] = "value";
      return true;
    });
  });
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data, Parse(R"({"key": "value"})"));
  EXPECT_THAT(platform.calls, ElementsAre("SetSuccess"));
}

TEST(AnswerWith, ReportsAFailureBeforeItReadsAndLogsTheRequest) {
  FakePlatform platform;
  const Answer answer = Handle(R"({"x": 1})", [&](Handler& handler) {
    handler.AnswerWith(kSite, [&](Json::Value& result) {
      result["key"] = "lost";
      return handler.Fail(2301);
    });
  });
  EXPECT_EQ(answer.code, 2301);
  EXPECT_TRUE(answer.data.isNull());
  EXPECT_THAT(platform.calls, ElementsAre("SetError", "GetParam"));
  ASSERT_EQ(platform.log.size(), 1U);
  EXPECT_EQ(platform.log[0].source, "somewhere");
  EXPECT_EQ(platform.log[0].line, 7);
  EXPECT_EQ(platform.log[0].text, "Request: {\"x\":1}\n");
}

TEST(AnswerTo, GivesTheParametersAndAnswersWithoutData) {
  FakePlatform platform;
  const Answer answer = Handle(R"({"x": 1})", [](Handler& handler) {
    handler.AnswerTo(kSite, [](const Json::Value& params) {
      EXPECT_EQ(params, Parse(R"({"x": 1})"));
      return true;
    });
  });
  EXPECT_EQ(answer.code, 0);
  EXPECT_TRUE(answer.data.isNull());
  EXPECT_THAT(platform.calls, ElementsAre("GetParam", "SetSuccess"));
}

TEST(AnswerTo, ReportsAFailureBeforeItReadsTheParametersAgainAndLogsThem) {
  FakePlatform platform;
  const Answer answer = Handle(R"({"x": [true, null]})", [](Handler& handler) {
    handler.AnswerTo(kSite, [](const Json::Value&) { return false; });
  });
  EXPECT_EQ(answer.code, 2302);
  EXPECT_THAT(platform.calls, ElementsAre("GetParam", "SetError", "GetParam"));
  ASSERT_EQ(platform.log.size(), 2U);
  EXPECT_EQ(platform.log[0].text, "There is no error setup");
  EXPECT_EQ(platform.log[1].text, "Request: {\"x\":[true,null]}\n");
}

TEST(AnswerTo, LogsAMissingParameterObjectAsNull) {
  FakePlatform platform;
  Handle("null", [](Handler& handler) {
    handler.AnswerTo(kSite, [&](const Json::Value& params) {
      EXPECT_TRUE(params.isNull());
      return handler.Fail(2301);
    });
  });
  ASSERT_EQ(platform.log.size(), 1U);
  EXPECT_EQ(platform.log[0].text, "Request: null\n");
}

}  // namespace
