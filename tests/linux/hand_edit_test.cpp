// An administrator's editor, which takes no lock, saves a file at each system call of a change: the edit is preserved.
#include <gmock/gmock.h>

#include <algorithm>
#include <filesystem>
#include <iostream>
#include <map>
#include <set>

#include "call.h"
#include "injected_failures.h"
#include "writes.h"

namespace {

using testing::IsEmpty;

// The lines that the editor inserts at the beginning of a file. Where the platform writes whole records, they have a
// value of the record, which a record that was read before the edit does not have.
std::string EditOf(const std::string& file) {
  if (file == "/etc/idmapd.conf") return "[Static]\nhand@LAB.TEST = bob\n";
  if (file == "/etc/nfs.conf.d/vorn.conf") return "[mountd]\nmanage-gids = y\n";
  return "# by hand\n";
}

using Editor = void (*)(const TemporaryRoot& root, const std::string& path, const std::string& text);

const struct {
  const char* name;
  Editor save;
} kEditors[] = {
    {"an editor that writes in place",
     [](const TemporaryRoot& root, const std::string& path, const std::string& text) { root.Write(path, text); }},
    {"an editor that replaces the file",
     [](const TemporaryRoot& root, const std::string& path, const std::string& text) {
       root.Write(path + "~new", text);
       std::filesystem::rename(root.At(path + "~new"), root.At(path));
     }},
};

// Returns the file of a change that administrators edit; nullptr if the change writes no such file.
const char* EditedFile(const Change& change) {
  static const std::set<std::string> documents = {"/etc/exports", "/etc/idmapd.conf", "/etc/nfs.conf.d/vorn.conf"};
  return documents.count(change.files.back()) != 0 ? change.files.back() : nullptr;
}

// Saves an edit at system call number `call` of a change, and expects that the change keeps the edit or is refused.
// Returns whether the change made that many calls.
bool KeepsTheEditAt(int call, size_t index, Editor save, const std::string& done) {
  const TemporaryRoot root;
  WriteAllFiles(root);
  const Change change = AllChanges(root)[index];
  const char* file = EditedFile(change);
  const std::string edit = EditOf(file);
  const std::string before = root.Read(file).value_or("");
  const std::optional<int> refused = InterruptAtSystemCall(
      call, [&] { return change.make() < 0 ? 1 : 0; }, [&] { save(root, file, edit + root.Read(file).value_or("")); });
  if (!refused) return false;
  EXPECT_EQ(root.Read(file), edit + (*refused == 0 ? done : before)) << call;
  EXPECT_THAT(Leftovers(root, change), IsEmpty()) << call;
  EXPECT_GE(change.make(), 0) << call;
  EXPECT_EQ(root.Read(file), edit + done) << call;
  return true;
}

using HandEdit = Writes;

TEST_F(HandEdit, IsNeverOverwrittenWheneverItIsMade) {
  int edits = 0;
  for (size_t index = 0; index < AllChanges(TemporaryRoot()).size(); ++index) {
    const TemporaryRoot root;
    WriteAllFiles(root);
    const Change change = AllChanges(root)[index];
    if (EditedFile(change) == nullptr) continue;
    EXPECT_GE(change.make(), 0) << change.name;
    const std::string done = root.Read(EditedFile(change)).value_or("");
    for (const auto& editor : kEditors) {
      SCOPED_TRACE(std::string(change.name) + ", " + editor.name);
      int call = 0;
      while (KeepsTheEditAt(call, index, editor.save, done) && !HasFailure()) ++call;
      EXPECT_GT(call, 10);
      edits += call;
    }
  }
  std::cout << "  " << edits << " edits\n";
}

// ---------------------------------------------------------------------------------------------
// Edits of another file, which is read later and overrides the change.

struct Override {
  const char* change;
  const char* file;
  const char* text;
};

constexpr Override kOverrides[] = {
    {"a change of the domain", "/etc/idmapd.conf.d/zz.conf", "[General]\nDomain = other.test\n"},
    {"a change of a port", "/etc/nfs.conf.d/zz.conf", "[statd]\nport = 5000\n"},
};

// Changes do not all make the same number of calls: a file that has just been written is read again.
constexpr int kSpread = 30;

enum Outcome { kDone, kDoneWithWarning, kRefused };

// Writes the other file at system call number `call` of the change. nullopt: the change does not make that many calls.
std::optional<int> OutcomeWithOverrideAt(int call, const Override& override) {
  const TemporaryRoot root;
  WriteAllFiles(root);
  const std::vector<Change> changes = AllChanges(root);
  const auto change = std::find_if(changes.begin(), changes.end(),
                                   [&](const Change& c) { return std::string(c.name) == override.change; });
  const Contents before = ContentsOf(root, *change);
  const std::optional<int> outcome = InterruptAtSystemCall(
      call,
      [&]() -> int {
        const VORN::CallContext context({});
        if (change->make() < 0) return kRefused;
        return context.warnings().empty() ? kDone : kDoneWithWarning;
      },
      [&] { root.Write(override.file, override.text); });
  if (outcome == kRefused) {
    EXPECT_EQ(ContentsOf(root, *change), before) << call;
  }
  return outcome;
}

TEST_F(HandEdit, OfAnOverridingFileIsNoticedBeforeAndAfterTheWrite) {
  for (const Override& override : kOverrides) {
    std::map<int, int> outcomes;
    int ended = 0;  // changes in sequence that made fewer calls
    for (int call = 0; ended < kSpread; ++call) {
      const std::optional<int> outcome = OutcomeWithOverrideAt(call, override);
      ended = outcome ? 0 : ended + 1;
      if (outcome) ++outcomes[*outcome];
    }
    EXPECT_GT(outcomes[kRefused], 0) << override.change;
    EXPECT_GT(outcomes[kDoneWithWarning], 0) << override.change << ": what is in force was not read back";
    EXPECT_GT(outcomes[kDone], 0) << override.change << ", after what is in force was read back";
  }
}

}  // namespace
