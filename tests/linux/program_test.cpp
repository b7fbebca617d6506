#include "program.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "core.h"
#include "processes.h"
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

// Runs a shell script, as the program that it is.
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
  const Outcome outcome = RunScript("cat; ls /proc/self/fd | wc -l; echo $VORN_ROOT; echo \"[$SECRET]\"");
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
  const std::string script = "for pid in $(cat " + pids + "); do kill -0 $pid 2>/dev/null && exit 1; done; exit 0";
  EXPECT_TRUE(Eventually([&] { return RunScript(script).status.ok(); }));
}

TEST(RunProgram, DoesNotWaitForWhoeverKeepsTheOutputOpen) {
  const Outcome outcome = RunScript("sleep 1000 & echo done", {std::chrono::minutes(5), milliseconds(100)});
  EXPECT_TRUE(outcome.status.ok());
  EXPECT_THAT(outcome.lines, ElementsAre("done"));
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

}  // namespace
