// Tests a request with each of its platform calls failing in turn.
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
  void (*furnish)(FakePlatform* platform);  // the box on which every call of the request succeeds
};

// Releases, the answer and the parameters for the log: all that may follow a failure.
inline testing::Matcher<std::string> IsRelease() {
  using testing::EndsWith;
  return testing::AnyOf(testing::StartsWith("~"), EndsWith("Free"));
}

inline testing::Matcher<std::string> IsEndOfRequest() { return testing::AnyOf(IsRelease(), "SetError", "GetParam"); }

// Fails each call that can fail, one per run. The request answers once, with an error unless the
// call's operation is one of the `tolerated`; nothing stays alive, and nothing is begun after an
// error. How many runs there were.
inline int ExpectOneAnswerWhicheverCallFails(const Request& request, const std::vector<std::string>& tolerated = {}) {
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

// Has each call throw, one per run: the exception leaves the entry function, and only releases are
// called on its way. How many runs there were.
inline int ExpectOnlyReleasesWhicheverCallThrows(const Request& request) {
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

// Succeeds, and logs nothing, with whichever non-negative number its calls say that they are done.
inline void ExpectSuccessHoweverItIsSaid(const Request& request) {
  for (const int done : {0, 1, std::numeric_limits<int>::max()}) {
    FakePlatform platform;
    request.furnish(&platform);
    platform.done = done;
    EXPECT_EQ(Call(request.entry, request.params).code, 0) << request.params << done;
    EXPECT_THAT(platform.log, testing::IsEmpty()) << request.params << done;
  }
}

#endif  // VORN_TESTS_SUPPORT_EACH_CALL_H
