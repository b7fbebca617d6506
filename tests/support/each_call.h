// Tests a request with every platform call failing or throwing once, one call per run.
#ifndef VORN_TESTS_SUPPORT_EACH_CALL_H
#define VORN_TESTS_SUPPORT_EACH_CALL_H

#include <gmock/gmock.h>

#include <limits>
#include <stdexcept>
#include <string>
#include <vector>

#include "entry_functions.h"
#include "fake_platform.h"

struct Request {
  Entry entry;
  const char* params;
  void (*furnish)(FakePlatform* platform);  // sets up a box on which every call of the request succeeds
};

// Matches the calls that may follow a failure: releases, the answer, and the parameters for the log.
inline testing::Matcher<std::string> IsRelease() {
  using testing::EndsWith;
  return testing::AnyOf(testing::StartsWith("~"), EndsWith("Free"));
}

inline testing::Matcher<std::string> IsEndOfRequest() { return testing::AnyOf(IsRelease(), "SetError", "GetParam"); }

// Makes each call that can fail do so, one per run, and returns the number of runs. Expects that the
// request answers once, with an error unless the operation is one of the `tolerated`, that no object is
// leaked, and that only releases follow an error.
inline int ExpectOneAnswerWhenAnyCallFails(const Request& request, const std::vector<std::string>& tolerated = {}) {
  for (int n = 1;; ++n) {
    FakePlatform platform;
    request.furnish(&platform);
    platform.FailCall(n);
    const Answer answer = Call(request.entry, request.params);
    if (platform.failed_calls.empty()) return n - 1;
    const std::string& failed = platform.failed_calls[0];
    const std::string operation = failed.substr(0, failed.find(' '));
    EXPECT_EQ(answer.count, 1) << failed;
    EXPECT_THAT(platform.live_objects, testing::IsEmpty()) << failed;
    if (testing::Matches(testing::Contains(operation))(tolerated)) {
      EXPECT_EQ(answer.code, 0) << failed;
      continue;
    }
    EXPECT_EQ(answer.code, 2302) << failed;
    EXPECT_THAT(platform.CallsAfterFailure(), testing::Each(IsEndOfRequest())) << failed;
  }
}

// Makes each call throw, one per run, and returns the number of runs. Expects that the exception leaves
// the entry function and that only releases are called meanwhile.
inline int ExpectOnlyReleasesWhenAnyCallThrows(const Request& request) {
  for (int n = 1;; ++n) {
    FakePlatform platform;
    request.furnish(&platform);
    platform.ThrowCall(n);
    bool has_thrown = false;
    try {
      Call(request.entry, request.params);
    } catch (const std::runtime_error&) {
      has_thrown = true;
    }
    if (!has_thrown) return n - 1;
    EXPECT_THAT(platform.CallsAfterFailure(), testing::Each(IsRelease())) << "call " << n;
    EXPECT_THAT(platform.live_objects, testing::IsEmpty()) << "call " << n;
  }
}

// Expects success without log lines for every non-negative result of the platform operations.
inline void ExpectSuccessForEveryNonNegativeResult(const Request& request) {
  for (const int done : {0, 1, std::numeric_limits<int>::max()}) {
    FakePlatform platform;
    request.furnish(&platform);
    platform.done = done;
    EXPECT_EQ(Call(request.entry, request.params).code, 0) << request.params << done;
    EXPECT_THAT(platform.log, testing::IsEmpty()) << request.params << done;
  }
}

#endif  // VORN_TESTS_SUPPORT_EACH_CALL_H
