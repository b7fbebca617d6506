// An administrator's editor, which takes no lock, saves a file at each system call of a change: the edit is preserved.
#include <gmock/gmock.h>

#include <filesystem>
#include <iostream>
#include <set>

#include "injected_failures.h"
#include "writes.h"

namespace {

using testing::IsEmpty;

constexpr char kLine[] = "# by hand\n";

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
  FurnishFiles(root);
  const Change change = AllChanges(root)[index];
  const char* file = EditedFile(change);
  const std::string before = root.Read(file).value_or("");
  const std::optional<int> refused = InterruptAtSystemCall(
      call, [&] { return change.make() < 0 ? 1 : 0; }, [&] { save(root, file, kLine + root.Read(file).value_or("")); });
  if (!refused) return false;
  EXPECT_EQ(root.Read(file), kLine + (*refused == 0 ? done : before)) << call;
  EXPECT_THAT(Leftovers(root, change), IsEmpty()) << call;
  EXPECT_GE(change.make(), 0) << call;
  EXPECT_EQ(root.Read(file), kLine + done) << call;
  return true;
}

using HandEdit = Writes;

TEST_F(HandEdit, IsNeverOverwrittenWheneverItIsMade) {
  int edits = 0;
  for (size_t index = 0; index < AllChanges(TemporaryRoot()).size(); ++index) {
    const TemporaryRoot root;
    FurnishFiles(root);
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

}  // namespace
