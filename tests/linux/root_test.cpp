#include "root.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>

#include "temporary_root.h"

namespace vorn {
namespace {

namespace fs = std::filesystem;

TEST(Root, IsTheBoxUnlessTheEnvironmentNamesAnother) {
  unsetenv("VORN_ROOT");
  EXPECT_TRUE(Root::Current().is_box());
  const TemporaryRoot root;
  EXPECT_FALSE(Root::Current().is_box());
  EXPECT_EQ(Root::Current().directory(), root.directory());
}

TEST(Root, DirectoryIsKeptWithoutTrailingSlashes) {
  const struct {
    const char* given;
    const char* directory;
    bool is_box;
  } cases[] = {
      {"", "/", true}, {"/", "/", true}, {"//", "/", true}, {"/trial/", "/trial", false}, {"/a/b", "/a/b", false}};
  for (const auto& c : cases) {
    EXPECT_EQ(Root(c.given).directory(), c.directory) << c.given;
    EXPECT_EQ(Root(c.given).is_box(), c.is_box) << c.given;
  }
}

TEST(Root, LocatesPathsBelowItself) {
  const TemporaryRoot root;
  root.Write("/etc/exports", "");
  root.Write("/data/real/file", "");
  fs::create_symlink("/data", root.At("/absolute"));
  fs::create_symlink("../data/real", root.At("/etc/relative"));
  fs::create_symlink("../../../../etc/exports", root.At("/data/escape"));
  fs::create_symlink("/nowhere/yet", root.At("/dangling"));
  const struct {
    const char* path;
    const char* place;
  } cases[] = {
      {"/etc/exports", "/etc/exports"},
      {"/etc/../etc/./exports", "/etc/exports"},
      {"/../../etc/exports", "/etc/exports"},
      {"//etc//exports/", "/etc/exports"},
      {"/new/folder/file", "/new/folder/file"},
      {"/absolute/real/file", "/data/real/file"},
      {"/etc/relative/file", "/data/real/file"},
      {"/data/escape", "/etc/exports"},
      {"/dangling", "/nowhere/yet"},
      {"/etc/relative/..", "/data"},
      {"/etc/exports/below", "/etc/exports/below"},
  };
  for (const auto& c : cases) {
    const Result<std::string> place = Root::Current().Locate(c.path);
    ASSERT_TRUE(place.ok()) << c.path;
    EXPECT_EQ(*place, root.At(c.place)) << c.path;
  }
}

TEST(Root, OfTheBoxResolvesLinksAsTheSystemDoes) {
  const TemporaryRoot folder;
  folder.Write("/file", "");
  fs::create_symlink(folder.At("/file"), folder.At("/link"));
  const Result<std::string> place = Root("/").Locate(folder.At("/link"));
  ASSERT_TRUE(place.ok());
  EXPECT_EQ(*place, fs::canonical(folder.At("/file")));
}

TEST(Root, RefusesWhatHasNoPlace) {
  const TemporaryRoot root;
  fs::create_symlink("b", root.At("/a"));
  fs::create_symlink("a", root.At("/b"));
  EXPECT_EQ(Root::Current().Locate("/a").status().code(), ELOOP);
  EXPECT_EQ(Root::Current().Locate("etc/exports").status().code(), EINVAL);
  EXPECT_EQ(Root::Current().Locate("").status().code(), EINVAL);
  EXPECT_EQ(Root("trial").Locate("/etc/exports").status().code(), EINVAL);
}

}  // namespace
}  // namespace vorn
