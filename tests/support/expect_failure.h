// The expectations on the answer of every failed request.
#ifndef VORN_TESTS_SUPPORT_EXPECT_FAILURE_H
#define VORN_TESTS_SUPPORT_EXPECT_FAILURE_H

#include <gmock/gmock.h>
#include <json/writer.h>

#include <string>
#include <vector>

#include "fake_platform.h"

constexpr char kNoErrorSetup[] = "There is no error setup";

// The last line of a failed request.
inline std::string RequestText(const std::string& params) {
  Json::StreamWriterBuilder one_line;
  one_line["indentation"] = "";
  return "Request: " + Json::writeString(one_line, Parse(params)) + "\n";
}

// Every line is an error of `source` (but one, which the handlers' base logs).
inline void ExpectLog(const FakePlatform& platform, const std::string& source, const std::vector<std::string>& texts) {
  EXPECT_THAT(platform.LogTexts(), testing::ElementsAreArray(texts));
  for (const LogLine& line : platform.log) {
    EXPECT_EQ(line.priority, 3) << line.text;
    EXPECT_EQ(line.source, line.text == kNoErrorSetup ? "handler" : source) << line.text;
    EXPECT_GT(line.line, 0) << line.text;
  }
}

// One answer, `code`; `texts` in the log and, last of all that is done, the request; nothing left behind.
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
