// A draft reads the files of another store as they were at first, and keeps its writes to itself.
#include "draft_store.h"

#include <gmock/gmock.h>

#include <chrono>
#include <filesystem>

#include "file_store.h"
#include "temporary_root.h"

namespace vorn {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr char kFile[] = "/etc/nfs.conf.d/vorn.conf";
constexpr char kFolder[] = "/etc/nfs.conf.d";

class Draft : public testing::Test {
 protected:
  std::string Read(const std::string& path = kFile) const {
    const Result<StoredFile> file = draft_.Read(path);
    EXPECT_TRUE(file.ok()) << file.status().reason();
    return file.ok() ? file->text : "";
  }

  Version VersionOf(const std::string& path = kFile) const {
    const Result<Version> version = draft_.VersionOf(path);
    EXPECT_TRUE(version.ok()) << version.status().reason();
    return version.ok() ? *version : Version{};
  }

  std::vector<std::string> Names() const {
    const Result<StoredFolder> folder = draft_.List(kFolder);
    EXPECT_TRUE(folder.ok()) << folder.status().reason();
    return folder.ok() ? folder->names : std::vector<std::string>();
  }

  void Write(const std::string& text, const std::string& path = kFile) {
    const Status status = draft_.Replace(path, text, draft_.Read(path)->version, 0644).status();
    EXPECT_TRUE(status.ok()) << status.reason();
  }

  void Remove() { EXPECT_TRUE(draft_.Remove(kFile, draft_.Read(kFile)->version).ok()); }

  const TemporaryRoot root_;
  FileStore store_{Root::Current()};
  DraftStore draft_{store_};
};

TEST_F(Draft, ReadsThroughToTheStore) {
  root_.Write(kFile, "text");
  EXPECT_EQ(Read(), "text");
  EXPECT_EQ(draft_.Read(kFile)->location, root_.At(kFile));
  EXPECT_EQ(VersionOf(), *store_.VersionOf(kFile));
  EXPECT_FALSE(draft_.Read("/etc/missing")->version.exists);
}

TEST_F(Draft, FailsWhereTheStoreCannotRead) {
  std::filesystem::create_directories(root_.At(kFile));
  EXPECT_EQ(draft_.Read(kFile).status().code(), store_.Read(kFile).status().code());
  EXPECT_EQ(draft_.Replace(kFile, "text", Version{}, 0644).status().code(), store_.Read(kFile).status().code());
}

TEST_F(Draft, KeepsWhatItReadFirst) {
  root_.Write(kFile, "first");
  EXPECT_EQ(Read(), "first");
  const Version version = VersionOf();
  root_.Write(kFile, "later");
  EXPECT_EQ(Read(), "first");
  EXPECT_EQ(VersionOf(), version);
  EXPECT_TRUE(draft_.Read(kFile)->is_settled) << "a snapshot does not change";
}

TEST_F(Draft, KeepsTheNamesThatItListedFirst) {
  root_.Write(kFile, "");
  EXPECT_THAT(Names(), ElementsAre("vorn.conf"));
  root_.Write(std::string(kFolder) + "/other.conf", "");
  EXPECT_THAT(Names(), ElementsAre("vorn.conf"));
}

TEST_F(Draft, WritesNothing) {
  root_.Write(kFile, "before");
  const Version stored = *store_.VersionOf(kFile);
  Write("after");
  Write("new", "/new/folder/file");
  EXPECT_EQ(Read(), "after");
  EXPECT_EQ(Read("/new/folder/file"), "new");
  EXPECT_EQ(*store_.VersionOf(kFile), stored);
  EXPECT_FALSE(std::filesystem::exists(root_.At("/new")));
  Remove();
  EXPECT_FALSE(VersionOf().exists);
  EXPECT_EQ(*store_.VersionOf(kFile), stored);
}

TEST_F(Draft, LeavesModesAndFoldersAlone) {
  root_.Write(kFile, "text");
  constexpr std::filesystem::perms kMode{0640};
  std::filesystem::permissions(root_.At(kFile), kMode);
  EXPECT_TRUE(draft_.SetMode(kFile, 0600).ok());
  EXPECT_EQ(std::filesystem::status(root_.At(kFile)).permissions(), kMode);
  EXPECT_TRUE(draft_.MakeFolder("/new/folder").ok());
  EXPECT_TRUE(draft_.Confirm(kFile).ok());
  EXPECT_FALSE(std::filesystem::exists(root_.At("/new")));
}

TEST_F(Draft, GivesEachStateAVersionOfItsOwn) {
  root_.Write(kFile, "text");
  const Version stored = VersionOf();
  Write("text");
  const Version written = VersionOf();
  EXPECT_NE(written, stored);
  Write("text");
  EXPECT_NE(VersionOf(), written);
  Remove();
  EXPECT_EQ(VersionOf(), Version{});
}

TEST_F(Draft, RefusesAWriteOverAnotherVersion) {
  root_.Write(kFile, "text");
  const Version first = draft_.Read(kFile)->version;
  Write("changed");
  EXPECT_EQ(draft_.Replace(kFile, "other", first, 0644).status().code(), kChangedBehind);
  EXPECT_EQ(draft_.Remove(kFile, first).code(), kChangedBehind);
  EXPECT_EQ(draft_.Replace(kFile, "other", Version{}, 0644).status().code(), kChangedBehind);
  EXPECT_EQ(Read(), "changed");
}

TEST_F(Draft, ListsTheFilesThatItCreatedAndNotThoseThatItRemoved) {
  root_.Write(std::string(kFolder) + "/10.conf", "");
  root_.Write(std::string(kFolder) + "/9.conf", "");
  const Version before = draft_.List(kFolder)->version;
  EXPECT_EQ(VersionOf(kFolder), before);
  Write("text");
  EXPECT_THAT(Names(), ElementsAre("9.conf", "10.conf", "vorn.conf"));
  const Version created = draft_.List(kFolder)->version;
  EXPECT_NE(created, before);
  EXPECT_EQ(VersionOf(kFolder), created);
  Write("changed");
  EXPECT_EQ(VersionOf(kFolder), created) << "the names are the same";
  Remove();
  EXPECT_THAT(Names(), ElementsAre("9.conf", "10.conf"));
  EXPECT_NE(VersionOf(kFolder), created);
}

TEST_F(Draft, ListsAFolderThatItCreated) {
  EXPECT_THAT(Names(), IsEmpty());
  EXPECT_FALSE(VersionOf(kFolder).exists);
  Write("text");
  EXPECT_THAT(Names(), ElementsAre("vorn.conf"));
  EXPECT_TRUE(VersionOf(kFolder).exists);
}

TEST_F(Draft, HasOneFileForAllPathsThatLeadToIt) {
  root_.Write("/etc/real.conf", "before");
  std::filesystem::create_directories(root_.At(kFolder));
  std::filesystem::create_symlink("/etc/real.conf", root_.At(kFile));
  EXPECT_EQ(Read("/etc/real.conf"), "before");
  Write("after");
  EXPECT_EQ(Read("/etc/real.conf"), "after");
  EXPECT_EQ(draft_.Changes().size(), 1U);
}

TEST_F(Draft, ReportsTheFilesThatDiffer) {
  root_.Write(kFile, "before");
  root_.Write("/etc/exports", "same");
  root_.Write("/etc/read", "");
  Read("/etc/read");
  EXPECT_THAT(draft_.Changes(), IsEmpty());
  Write("between");
  Write("after");
  Write("same", "/etc/exports");
  Write("new", "/etc/a");
  const std::vector<DraftStore::ChangedFile> changes = draft_.Changes();
  ASSERT_EQ(changes.size(), 2U);
  EXPECT_EQ(changes[0].path, "/etc/a");
  EXPECT_EQ(changes[0].before, std::nullopt);
  EXPECT_EQ(changes[0].after, "new");
  EXPECT_EQ(changes[1].path, kFile);
  EXPECT_EQ(changes[1].before, "before");
  EXPECT_EQ(changes[1].after, "after");
  Remove();
  EXPECT_EQ(draft_.Changes()[1].after, std::nullopt);
}

TEST_F(Draft, HasLocksThatAreAlwaysFree) {
  const auto stored = store_.Lock("/run/lock", std::chrono::milliseconds(0));
  ASSERT_TRUE(stored.ok());
  const auto first = draft_.Lock("/run/lock", std::chrono::milliseconds(0));
  const auto second = draft_.Lock("/run/lock", std::chrono::milliseconds(0));
  EXPECT_TRUE(first.ok() && second.ok());
  EXPECT_TRUE(draft_.Lock("/run/other", std::chrono::milliseconds(0)).ok());
  EXPECT_FALSE(std::filesystem::exists(root_.At("/run/other")));
}

}  // namespace
}  // namespace vorn
