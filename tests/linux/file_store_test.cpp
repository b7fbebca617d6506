// The files of a box below a folder: versions, and what a write does with them.
#include "file_store.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <filesystem>

#include "processes.h"
#include "temporary_root.h"

namespace vorn {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr char kFile[] = "/etc/nfs.conf";

Version VersionOf(const FileStore& store, const std::string& path = kFile) {
  const Result<Version> version = store.VersionOf(path);
  EXPECT_TRUE(version.ok()) << version.status().reason();
  return version.ok() ? *version : Version{};
}

TEST(FileStore, ReadsAMissingFileAsOneThatDoesNotExist) {
  const TemporaryRoot root;
  const FileStore store(Root::Current());
  const Result<StoredFile> file = store.Read(kFile);
  ASSERT_TRUE(file.ok());
  EXPECT_FALSE(file->version.exists);
  EXPECT_EQ(file->text, "");
  EXPECT_EQ(file->location, root.At(kFile));
  EXPECT_TRUE(file->is_settled);
}

TEST(FileStore, GivesEachStateOfAFileAVersionOfItsOwn) {
  const TemporaryRoot root;
  const FileStore store(Root::Current());
  const Version missing = VersionOf(store);
  root.Write(kFile, "one");
  const Version one = VersionOf(store);
  EXPECT_NE(one, missing);
  EXPECT_EQ(one, VersionOf(store));
  root.Write(kFile, "three");
  EXPECT_NE(VersionOf(store), one);
  std::filesystem::remove(root.At(kFile));
  EXPECT_EQ(VersionOf(store), missing);
}

TEST(FileStore, CallsAFileSettledOnceItsClockTickIsOver) {
  const TemporaryRoot root;
  const FileStore store(Root::Current());
  root.Write(kFile, "text");
  EXPECT_TRUE(Eventually([&] { return store.Read(kFile)->is_settled; }));
}

TEST(FileStore, FollowsALinkThatTakesTheFilesPlace) {
  const TemporaryRoot root;
  const FileStore store(Root::Current());
  root.Write(kFile, "text");
  root.Write("/data/other", "the target");
  const Version before = VersionOf(store);
  EXPECT_EQ(store.Read(kFile)->text, "text");
  std::filesystem::remove(root.At(kFile));
  std::filesystem::create_symlink("/data/other", root.At(kFile));
  EXPECT_EQ(store.Read(kFile)->text, "the target");
  EXPECT_EQ(store.Read(kFile)->location, root.At("/data/other"));
  EXPECT_NE(VersionOf(store), before);
  EXPECT_EQ(VersionOf(store), VersionOf(store, "/data/other"));
}

TEST(FileStore, NoticesThatALinkWasTurnedElsewhere) {
  const TemporaryRoot root;
  const FileStore store(Root::Current());
  root.Write("/data/a", "a");
  root.Write("/data/b", "b");
  std::filesystem::create_directories(root.At("/etc"));
  std::filesystem::create_symlink("/data/a", root.At(kFile));
  EXPECT_EQ(store.Read(kFile)->text, "a");
  const Version before = VersionOf(store);
  std::filesystem::remove(root.At(kFile));
  std::filesystem::create_symlink("/data/b", root.At(kFile));
  EXPECT_NE(VersionOf(store), before);
  EXPECT_EQ(store.Read(kFile)->text, "b");
}

TEST(FileStore, ReplacesAndRemovesOnlyTheExpectedVersion) {
  const TemporaryRoot root;
  FileStore store(Root::Current());
  EXPECT_TRUE(store.Replace(kFile, "one", Version{}, 0644).ok());
  const Version one = VersionOf(store);
  EXPECT_EQ(store.Replace(kFile, "two", Version{}, 0644).status().code(), kChangedBehind);
  EXPECT_TRUE(store.Replace(kFile, "two", one, 0644).ok());
  EXPECT_EQ(store.Remove(kFile, one).code(), kChangedBehind);
  EXPECT_EQ(root.Read(kFile), "two");
  EXPECT_TRUE(store.Remove(kFile, VersionOf(store)).ok());
  EXPECT_FALSE(root.Read(kFile).has_value());
  EXPECT_THAT(root.Names("/etc"), IsEmpty());
}

TEST(FileStore, ListsAFolderInTheOrderOfVersionNumbers) {
  const TemporaryRoot root;
  const FileStore store(Root::Current());
  for (const char* name : {"10.conf", "9.conf", "a.conf"}) root.Write(std::string("/etc/nfs.conf.d/") + name, "");
  EXPECT_THAT(store.List("/etc/nfs.conf.d")->names, ElementsAre("9.conf", "10.conf", "a.conf"));
  EXPECT_THAT(store.List("/nowhere")->names, IsEmpty());
  EXPECT_FALSE(store.List("/nowhere")->version.exists);
}

TEST(FileStore, GivesUpWaitingForALockThatIsKept) {
  const TemporaryRoot root;
  FileStore store(Root::Current());
  const auto first = store.Lock("/run/vorn/test.lock", std::chrono::milliseconds(50));
  ASSERT_TRUE(first.ok());
  const auto second = store.Lock("/run/vorn/test.lock", std::chrono::milliseconds(50));
  EXPECT_EQ(second.status().code(), kLockTimeout);
  EXPECT_THAT(second.status().reason(), testing::HasSubstr(root.At("/run/vorn/test.lock")));
}

}  // namespace
}  // namespace vorn
