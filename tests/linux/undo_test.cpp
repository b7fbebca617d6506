// A change of the history is taken back while later changes stay.
#include <gmock/gmock.h>

#include "call.h"
#include "core.h"
#include "history.h"
#include "history_support.h"
#include "inverse_merge.h"
#include "rehearsal.h"
#include "writes.h"

namespace vorn {
namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

constexpr char kExports[] = "/etc/exports";
constexpr char kThree[] = "/volume1/a *(ro)\n/volume1/b *(ro)\n/volume1/c *(ro)\n";

std::vector<VORN::HistoryEntry> List(const VORN::HistoryFilter& filter = {}) {
  std::vector<VORN::HistoryEntry> entries;
  int total = 0;
  EXPECT_EQ(VORN::ListHistory(filter, 0, 1000, &entries, &total), 0);
  EXPECT_THAT(entries, SizeIs(static_cast<std::size_t>(total)));
  return entries;
}

std::string Newest() { return List().front().id; }

class UndoTest : public Writes {
 protected:
  UndoTest() { root.Write("/etc/vorn/platform.conf", "[platform]\nhistory = yes\n"); }

  // The result of taking the change back, in a call.
  int Undo(const std::string& id, const VORN::Draft* draft = nullptr) {
    VORN::CallDescription description;
    description.caller = "bob";
    description.method = "undo";
    description.draft = draft;
    const VORN::CallContext call(description);
    const VornConf configuration;
    const int result = VORN::UndoChange(id, &files);
    reasons = call.reasons();
    return result;
  }

  const TemporaryRoot root;
  std::vector<std::string> files;
  std::vector<std::string> reasons;
};

TEST_F(UndoTest, KeepsLaterChangesOfOtherLines) {
  root.Write(kExports, kThree);
  ASSERT_TRUE(SaveFile(kExports, "/volume1/a *(rw)\n/volume1/b *(ro)\n/volume1/c *(ro)\n").ok());
  const std::string change = Newest();
  ASSERT_TRUE(SaveFile(kExports, "/volume1/a *(rw)\n/volume1/b *(ro)\n/volume1/c *(rw)\n").ok());
  EXPECT_EQ(Undo(change), 0);
  EXPECT_EQ(root.Read(kExports), "/volume1/a *(ro)\n/volume1/b *(ro)\n/volume1/c *(rw)\n");
  EXPECT_THAT(files, ElementsAre(kExports));
  const VORN::HistoryEntry undo = List().front();
  EXPECT_EQ(undo.kind, "undo");
  EXPECT_EQ(undo.undoes, change);
  EXPECT_EQ(undo.caller, "bob");
  EXPECT_EQ(Undo(change), VORN::kHistoryUndone);
  EXPECT_EQ(Undo(undo.id), 0) << "an undo is a change";
  EXPECT_EQ(root.Read(kExports), "/volume1/a *(rw)\n/volume1/b *(ro)\n/volume1/c *(rw)\n");
}

TEST_F(UndoTest, ShowsAConflictAndChangesNothing) {
  root.Write(kExports, kThree);
  ASSERT_TRUE(SaveFile(kExports, "/volume1/a *(rw)\n/volume1/b *(ro)\n/volume1/c *(ro)\n").ok());
  const std::string change = Newest();
  const std::string later = "/volume1/a *(sync)\n/volume1/b *(ro)\n/volume1/c *(ro)\n";
  ASSERT_TRUE(SaveFile(kExports, later).ok());
  EXPECT_EQ(Undo(change), VORN::kHistoryConflict);
  EXPECT_THAT(reasons, Contains(testing::AllOf(HasSubstr("/volume1/a *(sync)"), HasSubstr("/volume1/a *(ro)"))));
  EXPECT_EQ(root.Read(kExports), later);
  EXPECT_THAT(files, IsEmpty());
}

TEST_F(UndoTest, IsRefusedIfAFileWouldBecomeFaulty) {
  root.Write(kExports, "/volume1/a *(nonsense)\n");
  ASSERT_TRUE(SaveFile(kExports, "/volume1/a *(ro)\n").ok());
  EXPECT_EQ(Undo(Newest()), VORN::kHistoryFaulty);
  EXPECT_THAT(reasons, Contains(HasSubstr("nonsense")));
  EXPECT_EQ(root.Read(kExports), "/volume1/a *(ro)\n");
}

TEST_F(UndoTest, RemovesAFileThatTheChangeCreated) {
  ASSERT_TRUE(SaveFile(kExports, kThree).ok());
  EXPECT_EQ(Undo(Newest()), 0);
  EXPECT_EQ(root.Read(kExports), std::nullopt);
}

TEST_F(UndoTest, OfAnImportOfAKeytabIsRefused) {
  WriteAllFiles(root);
  for (const ::Change& change : AllChanges(root)) {
    if (std::string(change.name) == "an import of a keytab") {
      ASSERT_GE(change.make(), 0);
    }
  }
  EXPECT_EQ(Undo(Newest()), VORN::kHistoryFixed);
  EXPECT_THAT(reasons, Contains(HasSubstr("no keys")));
}

TEST_F(UndoTest, OfTheFirstKnownContentIsRefused) {
  root.Write(kExports, kThree);
  ASSERT_TRUE(SaveFile(kExports, "/volume1/a *(rw)\n").ok());
  const VORN::HistoryEntry found = List().back();
  EXPECT_EQ(found.kind, "found");
  EXPECT_EQ(Undo(found.id), VORN::kHistoryFixed) << "or the file would be removed";
}

TEST_F(UndoTest, OfAServiceOperationIsRefused) {
  EXPECT_EQ(KLIBServiceStop("nfsd", 0), 0);
  EXPECT_EQ(Undo(Newest()), VORN::kHistoryFixed);
}

TEST_F(UndoTest, OfAnUnknownChangeIsRefused) {
  ASSERT_TRUE(SaveFile(kExports, kThree).ok());
  for (const char* id : {"", "x", "0123456789012345678901234567890123456789", "../../x"}) {
    EXPECT_EQ(Undo(id), VORN::kHistoryNoChange) << id;
  }
}

TEST_F(UndoTest, IsRehearsedWithoutATrace) {
  root.Write(kExports, kThree);
  ASSERT_TRUE(SaveFile(kExports, "/volume1/a *(rw)\n").ok());
  const std::string change = Newest();
  const VORN::Draft draft;
  EXPECT_EQ(Undo(change, &draft), 0);
  ASSERT_THAT(draft.Report().files, SizeIs(1));
  EXPECT_THAT(draft.Report().files[0].difference, HasSubstr("+/volume1/a *(ro)\n"));
  EXPECT_EQ(root.Read(kExports), "/volume1/a *(rw)\n");
  EXPECT_EQ(Newest(), change);
}

TEST_F(UndoTest, IsFoundInTheListWithTheOtherChanges) {
  root.Write(kExports, kThree);
  ASSERT_TRUE(SaveFile(kExports, "/volume1/a *(rw)\n").ok());
  EXPECT_EQ(Undo(Newest()), 0);
  EXPECT_THAT(List(), SizeIs(3));
  VORN::HistoryFilter filter;
  filter.caller = "bob";
  EXPECT_THAT(List(filter), SizeIs(1));
  filter = {};
  filter.method = "und";
  EXPECT_THAT(List(filter), SizeIs(1));
  filter = {};
  filter.file = "/etc/idmapd.conf";
  EXPECT_THAT(List(filter), IsEmpty());
  filter = {};
  filter.until = 1;
  EXPECT_THAT(List(filter), IsEmpty());
  filter.until = 0;
  filter.since = List().front().time;
  EXPECT_FALSE(List(filter).empty());
  std::vector<VORN::HistoryEntry> page;
  int total = 0;
  EXPECT_EQ(VORN::ListHistory({}, 1, 1, &page, &total), 0);
  EXPECT_EQ(total, 3);
  ASSERT_THAT(page, SizeIs(1));
  EXPECT_EQ(page[0].id, List()[1].id);
}

TEST_F(UndoTest, IsShownWithItsFiles) {
  root.Write(kExports, kThree);
  ASSERT_TRUE(SaveFile(kExports, "/volume1/a *(rw)\n").ok());
  VORN::HistoryEntry entry;
  std::vector<VORN::HistoryFile> shown;
  EXPECT_EQ(VORN::ShowHistory(Newest(), &entry, &shown), 0);
  ASSERT_THAT(shown, SizeIs(1));
  EXPECT_THAT(shown[0].difference, HasSubstr("-/volume1/b *(ro)\n"));
  EXPECT_EQ(VORN::ShowHistory("x", &entry, &shown), VORN::kHistoryNoChange);
}

TEST(InverseMerge, DecidesByTheFileAsItIs) {
  using Text = std::optional<std::string>;
  const struct {
    const char* name;
    Text before;
    Text after;
    Text now;
    bool conflicts;
    Text content;
  } cases[] = {
      {"unchanged since", "a\n", "b\n", "b\n", false, "a\n"},
      {"taken back already", "a\n", "b\n", "a\n", false, "a\n"},
      {"removed since", "a\n", "b\n", std::nullopt, true, std::nullopt},
      {"created, unchanged since", std::nullopt, "b\n", "b\n", false, std::nullopt},
      {"created, edited since", std::nullopt, "b\n", "c\n", true, std::nullopt},
      {"removed by the change", "a\n", std::nullopt, std::nullopt, false, "a\n"},
      {"removed by the change, there again", "a\n", std::nullopt, "c\n", true, std::nullopt},
      {"other lines", "1\n2\n3\n4\n", "x\n2\n3\n4\n", "x\n2\n3\ny\n", false, "1\n2\n3\ny\n"},
      {"same line", "1\n2\n", "x\n2\n", "y\n2\n", true, std::nullopt},
      {"emptied by the change", "1\n", "", "2\n", true, std::nullopt},
  };
  for (const auto& c : cases) {
    const Result<InverseMerge> merged = MergeInverse(c.before, c.after, c.now);
    ASSERT_TRUE(merged.ok()) << c.name;
    EXPECT_EQ(merged->conflicts, c.conflicts) << c.name;
    EXPECT_EQ(merged->content, c.content) << c.name;
    EXPECT_EQ(merged->conflict.empty(), !c.conflicts) << c.name;
  }
}

}  // namespace
}  // namespace vorn
