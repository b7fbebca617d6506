#include <gmock/gmock.h>
#include <signal.h>
#include <sys/wait.h>

#include <string>
#include <vector>

#include "captured_log.h"
#include "core.h"
#include "injected_failures.h"
#include "processes.h"
#include "program.h"
#include "temporary_root.h"

namespace {

using std::chrono::milliseconds;
using testing::ElementsAre;
using testing::HasSubstr;
using vorn::ProgramOptions;
using vorn::RunProgram;
using vorn::Status;

struct Outcome {
  Status status;
  std::vector<std::string> lines;
};

// Runs a shell script directly as a program.
Outcome RunScript(const std::string& script, const ProgramOptions& options = {}) {
  Outcome outcome;
  outcome.status = RunProgram(
      "/bin/sh", {"-c", script}, [&](std::string_view line) { outcome.lines.emplace_back(line); }, options);
  return outcome;
}

TEST(RunProgram, SucceedsWithStatusZeroAndHandsOnEveryLine) {
  const Outcome outcome = RunScript("echo one; echo two >&2; printf three");
  EXPECT_TRUE(outcome.status.ok()) << outcome.status.reason();
  EXPECT_THAT(outcome.lines, ElementsAre("one", "two", "three"));
}

TEST(RunProgram, PassesArgumentsWithoutAShellInBetween) {
  std::vector<std::string> lines;
  const Status status =
      RunProgram("/bin/echo", {"a b", "$HOME; *", ""}, [&](std::string_view line) { lines.emplace_back(line); });
  EXPECT_TRUE(status.ok());
  EXPECT_THAT(lines, ElementsAre("a b $HOME; * "));
}

TEST(RunProgram, FailsAndSaysHowTheProgramEnded) {
  const struct {
    const char* script;
    const char* reason;
  } cases[] = {{"exit 3", "exited with status 3"}, {"kill -9 $$", "ended by signal 9"}};
  for (const auto& c : cases) {
    const Outcome outcome = RunScript(c.script);
    EXPECT_EQ(outcome.status.code(), vorn::kProgramFailed) << c.script;
    EXPECT_THAT(outcome.status.reason(), HasSubstr(c.reason)) << c.script;
  }
}

TEST(RunProgram, FailsWithTheSystemsReasonWhenThereIsNoSuchProgram) {
  EXPECT_EQ(RunProgram("/nowhere/program", {}, [](std::string_view) {}).code(), ENOENT);
}

TEST(RunProgram, GivesNothingOfOursButTheEnvironmentThatIsSaid) {
  const TemporaryRoot root;
  setenv("SECRET", "x", 1);
  ProgramOptions options;
  options.root = root.directory();
  const Outcome outcome = RunScript("cat; ls /proc/self/fd | wc -l; echo $VORN_ROOT; echo \"[$SECRET]\"", options);
  // Standard input, output and error, and the folder that ls reads.
  EXPECT_THAT(outcome.lines, ElementsAre("4", root.directory(), "[]"));
}

TEST(RunProgram, EndsAProgramThatTakesTooLongWithAllThatItStarted) {
  const TemporaryRoot root;
  const std::string pids = root.At("/pids");
  const Outcome outcome =
      RunScript("trap '' TERM; sleep 1000 & echo $! >" + pids + "; echo $$ >>" + pids + "; wait; wait",
                {milliseconds(300), milliseconds(100)});
  EXPECT_EQ(outcome.status.code(), vorn::kProgramFailed);
  EXPECT_THAT(outcome.status.reason(), HasSubstr("too long"));
  // An ended process remains as a zombie until its parent waits for it, and an orphan's new parent may never do that.
  const std::string script =
      "for pid in $(cat " + pids + "); do grep -qs '^State:[[:space:]][^Z]' /proc/$pid/status && exit 1; done; exit 0";
  EXPECT_TRUE(Eventually([&] { return RunScript(script).status.ok(); }));
}

TEST(RunProgram, DoesNotWaitForWhoeverKeepsTheOutputOpen) {
  const Outcome outcome = RunScript("sleep 1000 & echo $!", {std::chrono::minutes(5), milliseconds(100)});
  EXPECT_TRUE(outcome.status.ok());
  ASSERT_EQ(outcome.lines.size(), 1U);
  EXPECT_EQ(kill(std::stoi(outcome.lines[0]), SIGKILL), 0) << "what a program leaves behind is its own affair";
}

TEST(RunProgram, TakesAllThatAProgramLeftInThePipe) {
  const Outcome outcome = RunScript("exec seq 10000");
  ASSERT_EQ(outcome.lines.size(), 10000U);
  EXPECT_EQ(outcome.lines.back(), "10000");
}

TEST(RunProgram, FailsWhereItCannotWatchTheProgram) {
  const TemporaryRoot root;
  ChildProcess child([] {
    if (!FailSystemCall(SYS_pidfd_open, EMFILE)) return 1;
    return RunScript("sleep 1000").status.code() == EMFILE ? 0 : 2;
  });
  EXPECT_EQ(child.Wait(), 0);
}

TEST(RunProgram, KeepsNoDescriptorAndNoProcess) {
  const auto open_files = [] { return RunScript("ls /proc/$PPID/fd | wc -l").lines; };
  const auto before = open_files();
  for (const char* script : {"exit 0", "exit 1", "kill -9 $$"}) RunScript(script);
  EXPECT_EQ(open_files(), before);
  EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1) << "a child is left";
}

TEST(RunProgram, CutsEndlessLinesAndKeepsEveryByte) {
  const Outcome outcome = RunScript("head -c 3000 /dev/zero | tr '\\0' x");
  std::string all;
  for (const std::string& line : outcome.lines) {
    EXPECT_LE(line.size(), 1024U);
    all += line;
  }
  EXPECT_EQ(all, std::string(3000, 'x'));
}

TEST(KLIBCExec, RunsAProgramOfTheRoot) {
  const TemporaryRoot root;
  root.Write("/usr/vorn/script.sh", "#!/bin/sh\necho \"$# $1 $2\" >\"$VORN_ROOT/seen\"\nexit ${3:-0}\n");
  ASSERT_EQ(chmod(root.At("/usr/vorn/script.sh").c_str(), 0755), 0);
  EXPECT_EQ(KLIBCExec("/usr/vorn/script.sh", "reload id", "map", nullptr, "never"), 0);
  EXPECT_EQ(root.Read("/seen"), "2 reload id map\n");
  EXPECT_LT(KLIBCExec("/usr/vorn/script.sh", "a", "b", "7", nullptr), 0);
  EXPECT_EQ(KLIBCErrGet(), vorn::kProgramFailed);
  EXPECT_LT(KLIBCExec("/usr/vorn/missing.sh", nullptr, nullptr, nullptr, nullptr), 0);
  EXPECT_EQ(KLIBCErrGet(), ENOENT);
}

TEST(KLIBCExec, LogsWhatTheProgramSaysUpToAHundredLines) {
  const TemporaryRoot root;
  root.Write("/usr/vorn/script.sh", "#!/bin/sh\nseq 250\n");
  ASSERT_EQ(chmod(root.At("/usr/vorn/script.sh").c_str(), 0755), 0);
  TakeLog();
  EXPECT_EQ(KLIBCExec("/usr/vorn/script.sh", nullptr, nullptr, nullptr, nullptr), 0);
  const std::vector<LogLine> log = TakeLog();
  ASSERT_EQ(log.size(), 101U);
  EXPECT_EQ(log.front().text, "/usr/vorn/script.sh: 1");
  EXPECT_EQ(log.back().text, "/usr/vorn/script.sh: 150 more lines");
}

TEST(KLIBCExec, LetsOthersHaveTheConfigurationMeanwhile) {
  const TemporaryRoot root;
  root.Write("/usr/vorn/script.sh", "#!/bin/sh\nflock -n \"$VORN_ROOT/run/vorn/config.lock\" true\n");
  ASSERT_EQ(chmod(root.At("/usr/vorn/script.sh").c_str(), 0755), 0);
  const VornConf configuration;
  EXPECT_EQ(KLIBCExec("/usr/vorn/script.sh", nullptr, nullptr, nullptr, nullptr), 0);
}

}  // namespace
