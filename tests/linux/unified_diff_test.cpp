// Differences in the unified format; patch(1) is the reference.
#include "unified_diff.h"

#include <gmock/gmock.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <random>

#include "requirements.h"

namespace vorn {
namespace {

TEST(UnifiedDiff, IsEmptyForEqualTexts) {
  EXPECT_EQ(UnifiedDiff("/f", "a\nb\n", "a\nb\n"), "");
  EXPECT_EQ(UnifiedDiff("/f", "", ""), "");
  EXPECT_EQ(UnifiedDiff("/f", std::nullopt, std::nullopt), "");
}

TEST(UnifiedDiff, ShowsAChangedLineWithItsSurroundings) {
  EXPECT_EQ(UnifiedDiff("/etc/f", "1\n2\n3\n4\n5\n6\n7\n8\n9\n", "1\n2\n3\n4\nfive\n6\n7\n8\n9\n"),
            "--- /etc/f\n+++ /etc/f\n@@ -2,7 +2,7 @@\n 2\n 3\n 4\n-5\n+five\n 6\n 7\n 8\n");
}

TEST(UnifiedDiff, CanLeaveOutTheSurroundings) {
  EXPECT_EQ(UnifiedDiff("/f", "1\n2\n3\n", "1\ntwo\n3\nfour\n", 0),
            "--- /f\n+++ /f\n@@ -2 +2 @@\n-2\n+two\n@@ -3,0 +4 @@\n+four\n");
}

TEST(UnifiedDiff, ShowsACreatedAndARemovedFile) {
  EXPECT_EQ(UnifiedDiff("/f", std::nullopt, "a\n"), "--- /dev/null\n+++ /f\n@@ -0,0 +1 @@\n+a\n");
  EXPECT_EQ(UnifiedDiff("/f", "a\nb\n", std::nullopt), "--- /f\n+++ /dev/null\n@@ -1,2 +0,0 @@\n-a\n-b\n");
  EXPECT_EQ(UnifiedDiff("/f", std::nullopt, ""), "--- /dev/null\n+++ /f\n");
}

TEST(UnifiedDiff, MarksALastLineWithoutLineBreak) {
  EXPECT_EQ(UnifiedDiff("/f", "a", "a\n"), "--- /f\n+++ /f\n@@ -1 +1 @@\n-a\n\\ No newline at end of file\n+a\n");
}

TEST(UnifiedDiff, JoinsChangesThatAreCloseToEachOther) {
  const std::string before = "1\n2\n3\n4\n5\n6\n7\n8\n9\n";
  const std::string joined = UnifiedDiff("/f", before, "one\n2\n3\n4\n5\n6\n7\neight\n9\n");
  EXPECT_EQ(joined.find("@@ -1,9 +1,9 @@"), std::string("--- /f\n+++ /f\n").size()) << joined;
  const std::string apart = UnifiedDiff("/f", before, "one\n2\n3\n4\n5\n6\n7\n8\nnine\n");
  EXPECT_NE(apart.find("@@ -6,4 +6,4 @@"), std::string::npos) << apart;
}

TEST(UnifiedDiff, FindsTheFewestLines) {
  // A common prefix and suffix alone would make this one change of three lines.
  const std::string difference = UnifiedDiff("/f", "a\nb\nc\nd\n", "x\nb\nc\ny\n", 0);
  EXPECT_EQ(difference, "--- /f\n+++ /f\n@@ -1 +1 @@\n-a\n+x\n@@ -4 +4 @@\n-d\n+y\n");
}

TEST(UnifiedDiff, ShowsTextsWithoutACommonLineAsOneChange) {
  std::string before;
  std::string after;
  for (int i = 0; i < 20000; ++i) {
    before += "old " + std::to_string(i) + "\n";
    after += "new " + std::to_string(i) + "\n";
  }
  EXPECT_NE(UnifiedDiff("/f", before, after).find("@@ -1,20000 +1,20000 @@"), std::string::npos);
}

// A folder for the files of patch(1).
class PatchedFile {
 public:
  PatchedFile() {
    std::string name = testing::TempDir() + "diff-XXXXXX";
    folder_ = mkdtemp(name.data());
  }
  ~PatchedFile() { std::filesystem::remove_all(folder_); }
  PatchedFile(const PatchedFile&) = delete;
  PatchedFile& operator=(const PatchedFile&) = delete;

  // Returns what patch(1) makes of `before`.
  std::string Apply(const std::string& before, const std::string& difference) const {
    Write("file", before);
    Write("difference", difference);
    const std::string command = "cd " + folder_ + " && patch -s --fuzz=0 file difference >patch.log 2>&1";
    EXPECT_EQ(std::system(command.c_str()), 0) << Read("patch.log") << difference;
    return Read("file");
  }

 private:
  void Write(const std::string& name, const std::string& text) const { std::ofstream(folder_ + "/" + name) << text; }
  std::string Read(const std::string& name) const {
    std::ifstream file(folder_ + "/" + name);
    return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
  }

  std::string folder_;
};

std::string AnyText(std::mt19937* chance) {
  const auto any = [&](int most) { return std::uniform_int_distribution<int>(0, most)(*chance); };
  std::string text;
  for (int lines = any(12); lines > 0; --lines) text += std::string(1, static_cast<char>('a' + any(3))) + "\n";
  if (any(3) == 0 && !text.empty()) text.pop_back();
  return text;
}

TEST(UnifiedDiff, IsWhatPatchNeeds) {
  if (const std::string missing = ProgramMissing("patch"); !missing.empty()) GTEST_SKIP() << missing;
  const PatchedFile file;
  std::mt19937 chance(1);  // NOLINT(cert-msc32-c,cert-msc51-cpp): the same cases in each run
  for (int i = 0; i < 300; ++i) {
    const std::string before = AnyText(&chance);
    const std::string after = AnyText(&chance);
    if (before == after || before.empty() || after.empty()) continue;  // patch removes an empty file
    EXPECT_EQ(file.Apply(before, UnifiedDiff("file", before, after, i % 4)), after);
  }
}

}  // namespace
}  // namespace vorn
