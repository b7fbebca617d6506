#include "password_checker.h"

#include <gtest/gtest.h>

#include <future>
#include <memory>

#include "sandbox.h"

namespace vorn::server {
namespace {

using Kind = PasswordVerdict::Kind;
using std::chrono::milliseconds;
using Clock = PasswordChecker::Clock;

// A helper that receives the request and then runs this script, whose standard input is the socket.
std::vector<std::string> Script(const std::string& script) {
  return {"/bin/sh", "-c", "dd bs=4096 count=1 of=/dev/null status=none; " + script};
}

PasswordChecker::Limits Quick() {
  PasswordChecker::Limits limits;
  limits.step = milliseconds(1);
  limits.throttle.first_delay = milliseconds(0);
  return limits;
}

std::future<PasswordChecker::Result> Check(PasswordChecker& checker, const std::string& account = "alice",
                                           const std::string& address = "192.0.2.7") {
  const auto promise = std::make_shared<std::promise<PasswordChecker::Result>>();
  checker.Check({account, "password", address}, address,
                [promise](const PasswordChecker::Result& result) { promise->set_value(result); });
  return promise->get_future();
}

TEST(PasswordChecker, TellsTheVerdictOfItsHelper) {
  PasswordChecker granted(Script("/usr/bin/printf 'administrator\\nalice' >&0"), Quick());
  const auto result = Check(granted).get();
  EXPECT_EQ(result.verdict.kind, Kind::kGranted);
  EXPECT_EQ(result.verdict.role, Role::kAdministrator);
  EXPECT_EQ(result.verdict.account, "alice");
  PasswordChecker refused(Script("printf refused >&0"), Quick());
  EXPECT_EQ(Check(refused).get().verdict.kind, Kind::kRefused);
}

TEST(PasswordChecker, SurvivesAHelperThatCrashesOrIsMissing) {
  PasswordChecker crashing(Script("kill -SEGV $$"), Quick());
  EXPECT_EQ(Check(crashing).get().verdict.kind, Kind::kUnavailable);
  PasswordChecker missing({"/nonexistent/helper"}, Quick());
  EXPECT_EQ(Check(missing).get().verdict.kind, Kind::kUnavailable);
}

TEST(PasswordChecker, KillsAHelperThatHangsWithWhatItHasStarted) {
  const Sandbox sandbox;
  PasswordChecker::Limits limits = Quick();
  limits.deadline = milliseconds(200);
  PasswordChecker checker(Script("sleep 1000 & echo $! > " + sandbox.File("child") + "; wait"), limits);
  EXPECT_EQ(Check(checker).get().verdict.kind, Kind::kUnavailable);
  const int child = std::atoi(ReadWholeFile(sandbox.File("child")).c_str());
  ASSERT_GT(child, 0) << "the shell had no time to begin";
  const auto command = "/proc/" + std::to_string(child) + "/cmdline";
  EXPECT_TRUE(Eventually([&] { return ReadWholeFile(command).find("sleep") == std::string::npos; }));
}

TEST(PasswordChecker, AnswersWrongPasswordsAfterWholeSteps) {
  PasswordChecker::Limits limits = Quick();
  limits.step = milliseconds(700);
  PasswordChecker checker(Script("printf refused >&0"), limits);
  const auto begin = Clock::now();
  EXPECT_EQ(Check(checker).get().verdict.kind, Kind::kRefused);
  EXPECT_GE(Clock::now() - begin, milliseconds(700));
}

TEST(PasswordChecker, DelaysRepeatedAttempts) {
  PasswordChecker::Limits limits = Quick();
  limits.throttle.free_attempts = 1;
  limits.throttle.first_delay = milliseconds(600);
  PasswordChecker checker(Script("printf refused >&0"), limits);
  Check(checker).get();
  const auto begin = Clock::now();
  Check(checker).get();
  EXPECT_GE(Clock::now() - begin, milliseconds(600));
}

TEST(PasswordChecker, RefusesTooManyAttemptsOfOneAccountFromOneAddress) {
  PasswordChecker checker(Script("sleep 1000"), Quick());
  std::vector<std::future<PasswordChecker::Result>> waiting;
  for (int i = 0; i < 4; ++i) waiting.push_back(Check(checker));
  EXPECT_TRUE(Check(checker).get().too_many);
  waiting.push_back(Check(checker, "alice", "198.51.100.1"));
  waiting.push_back(Check(checker, "bob"));
  for (auto& each : waiting) EXPECT_EQ(each.wait_for(milliseconds(0)), std::future_status::timeout);
  checker.Close();
  for (auto& each : waiting) EXPECT_EQ(each.get().verdict.kind, Kind::kUnavailable);
  EXPECT_EQ(Check(checker).get().verdict.kind, Kind::kUnavailable) << "closed";
}

// The attackers wait for their delays; the owner comes from another address.
TEST(PasswordChecker, MakesRoomForTheOwnerOfAnAccount) {
  PasswordChecker::Limits limits = Quick();
  limits.attempts = 4;
  limits.throttle.free_attempts = 1;
  limits.throttle.first_delay = std::chrono::hours(1);
  limits.throttle.address_limit = limits.throttle.account_limit = std::chrono::hours(1);
  PasswordChecker checker(Script("printf refused >&0"), limits);
  Check(checker, "a").get();
  std::vector<std::future<PasswordChecker::Result>> attackers;
  for (const char* account : {"a", "b", "c", "d"}) attackers.push_back(Check(checker, account));
  EXPECT_EQ(Check(checker, "alice", "198.51.100.1").get().verdict.kind, Kind::kRefused) << "it was checked";
  checker.Close();
  int refused = 0;
  for (auto& each : attackers) refused += each.get().too_many ? 1 : 0;
  EXPECT_EQ(refused, 1);
}

}  // namespace
}  // namespace vorn::server
