#include "runtime_folder.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>

#include "sandbox.h"

namespace vorn::server {
namespace {

TEST(RuntimeFolder, IsMadeBelowTheRoot) {
  const Sandbox root;
  std::string error;
  const auto folder = RuntimeFolder::Claim(root.path(), &error);
  ASSERT_TRUE(folder) << error;
  EXPECT_EQ(folder->path(), root.File("run/vorn"));
  EXPECT_TRUE(std::filesystem::is_directory(folder->path()));
}

TEST(RuntimeFolder, BelongsToOneServerAtATime) {
  const Sandbox root;
  std::string error;
  auto first = RuntimeFolder::Claim(root.path(), &error);
  EXPECT_FALSE(RuntimeFolder::Claim(root.path(), &error));
  EXPECT_EQ(error, root.File("run/vorn") + ": another vornd serves this root");
  first.reset();
  EXPECT_TRUE(RuntimeFolder::Claim(root.path(), &error)) << error;
}

TEST(RuntimeFolder, IsNeverMadeOutsideTheRoot) {
  const Sandbox outside;
  const Sandbox root;
  std::filesystem::create_directory_symlink(outside.path(), root.File("run"));
  std::string error;
  EXPECT_FALSE(RuntimeFolder::Claim(root.path(), &error));
  EXPECT_TRUE(std::filesystem::is_empty(outside.path()));
}

TEST(RuntimeFolder, MayBeReachedThroughALinkInside) {
  const Sandbox root;
  std::filesystem::create_directory(root.File("var"));
  std::filesystem::create_directory_symlink("var", root.File("run"));
  std::string error;
  const auto folder = RuntimeFolder::Claim(root.path(), &error);
  ASSERT_TRUE(folder) << error;
  EXPECT_EQ(folder->path(), root.File("var/vorn"));
}

TEST(RuntimeFolder, CannotReplaceAFile) {
  const Sandbox root;
  root.Write("run", "");
  std::string error;
  EXPECT_FALSE(RuntimeFolder::Claim(root.path(), &error));
  EXPECT_NE(error, "");
}

}  // namespace
}  // namespace vorn::server
