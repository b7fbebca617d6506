// Expectations on failed requests.
#ifndef VORN_TESTS_SUPPORT_EXPECT_FAILURE_H
#define VORN_TESTS_SUPPORT_EXPECT_FAILURE_H

#include <gmock/gmock.h>
#include <json/writer.h>

#include <string>
#include <vector>

#include "fake_platform.h"

constexpr char kNoErrorSetup[] = "There is no error setup";

// The text of the last log line of a failed request.
inline std::string RequestText(const std::string& params) {
  Json::StreamWriterBuilder one_line;
  one_line["indentation"] = "";
  return "Request: " + Json::writeString(one_line, Parse(params)) + "\n";
}

// Expects these log texts, at priority LOG_ERR and from `source`. The base class of the handlers logs one of them.
inline void ExpectLog(const FakePlatform& platform, const std::string& source, const std::vector<std::string>& texts) {
  EXPECT_THAT(platform.LogTexts(), testing::ElementsAreArray(texts));
  for (const LogLine& line : platform.log) {
    EXPECT_EQ(line.priority, 3) << line.text;
    EXPECT_EQ(line.source, line.text == kNoErrorSetup ? "handler" : source) << line.text;
    EXPECT_GT(line.line, 0) << line.text;
  }
}

// Expects one answer with `code`, the log lines `texts`, the request as the last line after all calls, and no leak.
inline void ExpectFailure(const FakePlatform& platform, const Answer& answer, const std::string& params, int code,
                          const std::string& source, std::vector<std::string> texts) {
  SCOPED_TRACE(params);
  EXPECT_EQ(answer.code, code);
  EXPECT_EQ(answer.count, 1);
  texts.push_back(RequestText(params));
  ExpectLog(platform, source, texts);
  ASSERT_FALSE(platform.log.empty());
  EXPECT_EQ(platform.log.back().calls, platform.calls.size());
  EXPECT_THAT(platform.live_objects, testing::IsEmpty());
}

#endif  // VORN_TESTS_SUPPORT_EXPECT_FAILURE_H
