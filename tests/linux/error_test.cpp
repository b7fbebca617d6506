#include "error.h"

#include <gtest/gtest.h>
#include <syslog.h>

#include <cerrno>
#include <thread>

#include "captured_log.h"
#include "core.h"

namespace vorn {
namespace {

TEST(ToResult, OfASuccessIsZeroAndLeavesTheLastFailure) {
  static_cast<void>(ToSilentResult(Status::Failure(EBUSY, "")));
  EXPECT_EQ(ToResult({}), 0);
  EXPECT_EQ(KLIBCErrGet(), EBUSY);
}

TEST(ToResult, LeavesCodeFileAndLineAndLogsTheReasonOnce) {
  TakeLog();
  const int line = __LINE__ + 1;
  EXPECT_EQ(ToResult(Status::Failure(kRefusedText, "a blank in \"a b\" 100%s")), -1);
  EXPECT_EQ(KLIBCErrGet(), kRefusedText);
  EXPECT_STREQ(KLIBCErrorGetFile(), "error_test.cpp");
  EXPECT_EQ(KLIBCErrorGetLine(), line);
  const std::vector<LogLine> log = TakeLog();
  ASSERT_EQ(log.size(), 1U);
  EXPECT_EQ(log[0].priority, LOG_ERR);
  EXPECT_EQ(log[0].text, "error_test.cpp:" + std::to_string(line) + " a blank in \"a b\" 100%s");
}

TEST(ToResult, NamesWhatTheSystemSaid) {
  TakeLog();
  ToResult(Status::System(ENOENT, "/etc/exports"));
  const std::vector<LogLine> log = TakeLog();
  ASSERT_EQ(log.size(), 1U);
  EXPECT_NE(log[0].text.find("/etc/exports: No such file or directory"), std::string::npos) << log[0].text;
}

TEST(ToSilentResult, LogsNothing) {
  TakeLog();
  EXPECT_EQ(ToSilentResult(Status::Failure(ENOENT, "not in the list")), -1);
  EXPECT_EQ(KLIBCErrGet(), ENOENT);
  EXPECT_TRUE(TakeLog().empty());
}

TEST(ErrorFacility, IsEachThreadsOwn) {
  ToSilentResult(Status::Failure(EBUSY, ""));
  std::thread([] {
    EXPECT_EQ(KLIBCErrGet(), 0);
    EXPECT_STREQ(KLIBCErrorGetFile(), "");
    ToSilentResult(Status::Failure(EIO, ""));
    EXPECT_EQ(KLIBCErrGet(), EIO);
  }).join();
  EXPECT_EQ(KLIBCErrGet(), EBUSY);
}

}  // namespace
}  // namespace vorn
