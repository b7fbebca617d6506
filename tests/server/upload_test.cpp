#include "upload.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>

#include "sandbox.h"

namespace vorn::server {
namespace {

unsigned ModeOf(const std::string& path) {
  struct stat there {};
  return stat(path.c_str(), &there) == 0 ? there.st_mode & 07777U : 0;
}

TEST(UploadFolder, IsPrivate) {
  const Sandbox sandbox;
  std::filesystem::create_directory(sandbox.File("uploads"));
  std::string error;
  ASSERT_TRUE(UploadFolder::Open(sandbox.File("uploads"), &error)) << error;
  EXPECT_EQ(ModeOf(sandbox.File("uploads")), 0700U);
}

TEST(UploadFolder, IsEmptiedWhenItIsOpened) {
  const Sandbox sandbox;
  std::filesystem::create_directories(sandbox.File("uploads/folder"));
  sandbox.Write("uploads/left", "secret");
  sandbox.Write("uploads/folder/left", "secret");
  std::string error;
  ASSERT_TRUE(UploadFolder::Open(sandbox.File("uploads"), &error)) << error;
  EXPECT_TRUE(std::filesystem::is_empty(sandbox.File("uploads")));
}

TEST(UploadFolder, IsNoLinkToAnotherOne) {
  const Sandbox sandbox;
  const Sandbox other;
  other.Write("precious", "x");
  std::filesystem::create_directory_symlink(other.path(), sandbox.File("uploads"));
  std::string error;
  EXPECT_FALSE(UploadFolder::Open(sandbox.File("uploads"), &error));
  EXPECT_EQ(error, sandbox.File("uploads") + ": Not a directory");
  EXPECT_EQ(ReadWholeFile(other.File("precious")), "x");
}

TEST(Upload, IsAPrivateFileThatLivesAsLongAsItsObject) {
  const Sandbox sandbox;
  std::string error;
  const auto folder = UploadFolder::Open(sandbox.File("uploads"), &error);
  ASSERT_TRUE(folder) << error;
  std::optional<Upload> first = folder->Create();
  const std::optional<Upload> second = folder->Create();
  ASSERT_TRUE(first && second);
  EXPECT_NE(first->path(), second->path());
  EXPECT_TRUE(first->Append("ab") && first->Append("") && first->Append("c"));
  EXPECT_EQ(ReadWholeFile(first->path()), "abc");
  EXPECT_EQ(ModeOf(first->path()), 0600U);
  const std::string path = first->path();
  const Upload moved = std::move(*first);
  first.reset();
  EXPECT_TRUE(std::filesystem::exists(path));
  EXPECT_EQ(moved.path(), path);
}

}  // namespace
}  // namespace vorn::server
